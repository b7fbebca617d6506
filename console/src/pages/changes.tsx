// The changes of the history, as a table.
import type { ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../api/call';
import { time } from '../shared/words';

export type HistoryChange = Data<'VORN.Core.FileServ.NFS.History/v1/list'>['changes'][number];

const METHODS: Record<string, string> = {
  'VORN.Core.FileServ.NFS/v1/set': /*i18n*/ 'Settings of the service',
  'VORN.Core.FileServ.NFS/v2/set': /*i18n*/ 'Settings of the service',
  'VORN.Core.FileServ.NFS.AdvancedSetting/v1/set': /*i18n*/ 'Advanced settings',
  'VORN.Core.FileServ.NFS.SharePrivilege/v1/save': /*i18n*/ 'Rules of a shared folder',
  'VORN.Core.FileServ.NFS.IDMap/v1/create': /*i18n*/ 'New ID mappings',
  'VORN.Core.FileServ.NFS.IDMap/v1/set': /*i18n*/ 'Changed ID mapping',
  'VORN.Core.FileServ.NFS.IDMap/v1/delete': /*i18n*/ 'Deleted ID mappings',
  'VORN.Core.FileServ.NFS.Kerberos/v1/upload_key': /*i18n*/ 'Keytab',
  'VORN.Core.Share/v1/create': /*i18n*/ 'New shared folder',
  'VORN.Core.Share/v1/delete': /*i18n*/ 'Shared folder no longer shared',
};

const KINDS: Record<HistoryChange['kind'], string> = {
  change: /*i18n*/ 'Change',
  undo: /*i18n*/ 'Undone change',
  'by hand': /*i18n*/ 'Edit by hand',
  found: /*i18n*/ 'Content from before the history began',
  late: /*i18n*/ 'Recorded late',
};

/** What was changed, in words. */
export function subjectOf(change: HistoryChange): string {
  if (change.kind !== 'change' && change.kind !== 'late') return i18n._(KINDS[change.kind]);
  const known = change.method ? METHODS[change.method] : undefined;
  return known ? i18n._(known) : (change.method ?? i18n._(KINDS[change.kind]));
}

/** Who made a change. The history does not see who edits a file by hand, or who wrote it before it was first recorded. */
export function callerOf({ caller, kind }: HistoryChange): string {
  if (caller !== null) return caller;
  return kind === 'found' || kind === 'by hand' ? i18n._('not recorded') : i18n._('unknown');
}

export function ChangeTable({
  changes,
  label,
  actions,
}: {
  changes: HistoryChange[];
  label: string;
  /** What can be done with a change. */
  actions?: (change: HistoryChange) => ReactNode;
}) {
  return (
    <Table aria-label={label} variant="compact" gridBreakPoint="grid-md">
      <Thead>
        <Tr>
          <Th>{i18n._('When')}</Th>
          <Th>{i18n._('What')}</Th>
          <Th>{i18n._('Who')}</Th>
          <Th>{i18n._('Files')}</Th>
          {actions && <Th screenReaderText={i18n._('Actions')} />}
        </Tr>
      </Thead>
      <Tbody>
        {changes.map((change) => (
          <Tr key={change.id}>
            <Td dataLabel={i18n._('When')}>{time(change.time)}</Td>
            <Td dataLabel={i18n._('What')}>{subjectOf(change)}</Td>
            <Td dataLabel={i18n._('Who')}>{callerOf(change)}</Td>
            <Td dataLabel={i18n._('Files')}>{change.files.join(', ') || i18n._('none')}</Td>
            {actions && <Td className="row-actions">{actions(change)}</Td>}
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}
