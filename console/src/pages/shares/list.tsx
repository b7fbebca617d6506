import { useDeferredValue, useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, EmptyState, SearchInput, Toolbar, ToolbarContent, ToolbarItem } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../../api/call';
import { useMayWrite } from '../../session/session';
import { Loaded, PageFrame, ReadOnlyNotice } from '../../shared/page';
import { linkTo } from '../../shared/router';
import { useRead } from '../../shared/use-read';
import { CreateShare, DeleteShare } from './dialogs';

export type Share = Data<'VORN.Core.Share/v1/list'>['shares'][number];

const ruleCount = (count: number) =>
  i18n._('{n, plural, =0 {no rules, nobody may mount it} one {# rule} other {# rules}}', { n: count });

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
              <Td isActionCell>
                <Button
                  variant="link"
                  isInline
                  isAriaDisabled={share.rules > 0}
                  title={share.rules > 0 ? i18n._('Delete its rules first') : undefined}
                  aria-label={i18n._('Stop sharing {name}', { name: share.name })}
                  onClick={() => {
                    if (share.rules === 0) onDelete(share);
                  }}
                >
                  {i18n._('Stop sharing')}
                </Button>
              </Td>
            )}
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

export function ShareList() {
  const [text, setText] = useState('');
  const [creating, setCreating] = useState(false);
  const [deleted, setDeleted] = useState<Share | null>(null);
  const filter = useDeferredValue(text).toLowerCase();
  const shares = useRead('VORN.Core.Share/v1/list', {});
  const mayWrite = useMayWrite();
  const matches = (share: Share) =>
    share.name.toLowerCase().includes(filter) || share.path.toLowerCase().includes(filter);
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
              <Toolbar>
                <ToolbarContent>
                  <ToolbarItem>
                    <SearchInput
                      aria-label={i18n._('Search by name or folder')}
                      placeholder={i18n._('Search by name or folder')}
                      value={text}
                      {...(text && { resultsCount: found.length })}
                      onChange={(_event, value) => {
                        setText(value);
                      }}
                      onClear={() => {
                        setText('');
                      }}
                    />
                  </ToolbarItem>
                  {mayWrite && (
                    <ToolbarItem>
                      <Button
                        onClick={() => {
                          setCreating(true);
                        }}
                      >
                        {i18n._('Share a folder')}
                      </Button>
                    </ToolbarItem>
                  )}
                </ToolbarContent>
              </Toolbar>
              {found.length > 0 ? (
                <ShareTable shares={found} onDelete={setDeleted} />
              ) : (
                <EmptyState
                  headingLevel="h2"
                  titleText={text ? i18n._('No shared folder matches') : i18n._('No folder is shared yet')}
                />
              )}
            </>
          );
        }}
      </Loaded>
      {creating && (
        <CreateShare
          onClose={() => {
            setCreating(false);
          }}
        />
      )}
      {deleted && (
        <DeleteShare
          name={deleted.name}
          onClose={() => {
            setDeleted(null);
          }}
        />
      )}
    </PageFrame>
  );
}
