import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, EmptyState } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../../api/call';
import { useMayWrite } from '../../session/session';
import { ListToolbar, useFilter } from '../../shared/list';
import { Loaded, PageFrame, ReadOnlyNotice } from '../../shared/page';
import { linkTo } from '../../shared/router';
import { useRead } from '../../shared/use-read';
import { CreateShare, DeleteShare } from './dialogs';
import { ruleCount } from './rule';

export type Share = Data<'VORN.Core.Share/v1/list'>['shares'][number];

function ShareTable({ shares, onDelete }: { shares: Share[]; onDelete: (share: Share) => void }) {
  const mayWrite = useMayWrite();
  return (
    <Table aria-label={i18n._('Shared folders')} gridBreakPoint="grid-md">
      <Thead>
        <Tr>
          <Th>{i18n._('Name')}</Th>
          <Th>{i18n._('Folder on the box')}</Th>
          <Th>{i18n._('Rules')}</Th>
          {mayWrite && <Th screenReaderText={i18n._('Actions')} />}
        </Tr>
      </Thead>
      <Tbody>
        {shares.map((share) => (
          <Tr key={share.name}>
            <Td dataLabel={i18n._('Name')}>
              <a href={linkTo('shares', share.name)}>{share.name}</a>
            </Td>
            <Td dataLabel={i18n._('Folder on the box')}>{share.path}</Td>
            <Td dataLabel={i18n._('Rules')}>{ruleCount(share.rules)}</Td>
            {mayWrite && (
              <Td className="row-actions" modifier="nowrap">
                <Button
                  variant="link"
                  isInline
                  isAriaDisabled={share.rules > 0}
                  aria-label={i18n._('Stop sharing {name}', { name: share.name })}
                  onClick={() => {
                    if (share.rules === 0) onDelete(share);
                  }}
                >
                  {i18n._('Stop sharing')}
                </Button>
                {share.rules > 0 && (
                  <div>
                    <small>{i18n._('Delete its rules first')}</small>
                  </div>
                )}
              </Td>
            )}
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

export function ShareList() {
  const filter = useFilter();
  const [creating, setCreating] = useState(false);
  const [deleted, setDeleted] = useState<Share | null>(null);
  const wanted = filter.value.toLowerCase();
  const shares = useRead('VORN.Core.Share/v1/list', {});
  const mayWrite = useMayWrite();
  const matches = (share: Share) =>
    share.name.toLowerCase().includes(wanted) || share.path.toLowerCase().includes(wanted);
  return (
    <PageFrame
      title={i18n._('Shared folders')}
      purpose={i18n._('Folders of the box that clients can mount, each with its rules: who may mount it, and how.')}
    >
      <ReadOnlyNotice />
      <Loaded query={shares}>
        {({ data }) => {
          const found = data.shares.filter(matches);
          return (
            <>
              <ListToolbar label={i18n._('Search by name or folder')} filter={filter} count={found.length}>
                {mayWrite && (
                  <Button
                    onClick={() => {
                      setCreating(true);
                    }}
                  >
                    {i18n._('Share a folder')}
                  </Button>
                )}
              </ListToolbar>
              {found.length > 0 ? (
                <ShareTable shares={found} onDelete={setDeleted} />
              ) : (
                <EmptyState
                  headingLevel="h2"
                  titleText={filter.text ? i18n._('No shared folder matches') : i18n._('No folder is shared yet')}
                />
              )}
            </>
          );
        }}
      </Loaded>
      {creating && shares.data && (
        <CreateShare
          shown={shares.data}
          onClose={() => {
            setCreating(false);
          }}
        />
      )}
      {deleted && shares.data && (
        <DeleteShare
          name={deleted.name}
          shown={shares.data}
          onClose={() => {
            setDeleted(null);
          }}
        />
      )}
    </PageFrame>
  );
}
