import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, Title } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../../api/call';
import { ConfirmDialog } from '../../shared/change-dialog';
import { Loaded } from '../../shared/page';
import { useRead } from '../../shared/use-read';
import { time } from '../../shared/words';
import { CreateToken } from './create-token';
import { roleText } from './role';

type Token = Data<'VORN.Server.Token/v1/list'>[number];

const limits = (token: Token) => [...token.apis, ...token.shares].join(', ') || i18n._('none');
const lastUse = (token: Token) =>
  token.last_used === null ? i18n._('never') : `${time(token.last_used)}, ${token.last_address}`;
const expiry = (token: Token) => (token.expires === null ? i18n._('never') : time(token.expires));

function TokenTable({ tokens, onRevoke }: { tokens: Token[]; onRevoke: (token: Token) => void }) {
  if (tokens.length === 0) return <Content component="p">{i18n._('There are no tokens.')}</Content>;
  return (
    <Table aria-label={i18n._('Tokens')} variant="compact" gridBreakPoint="grid-lg">
      <Thead>
        <Tr>
          <Th>{i18n._('Name')}</Th>
          <Th>{i18n._('Role')}</Th>
          <Th>{i18n._('Limited to')}</Th>
          <Th>{i18n._('Last use')}</Th>
          <Th>{i18n._('Expires')}</Th>
          <Th screenReaderText={i18n._('Actions')} />
        </Tr>
      </Thead>
      <Tbody>
        {tokens.map((token) => (
          <Tr key={token.id}>
            <Td dataLabel={i18n._('Name')}>{token.name}</Td>
            <Td dataLabel={i18n._('Role')}>{roleText(token.role)}</Td>
            <Td dataLabel={i18n._('Limited to')}>{limits(token)}</Td>
            <Td dataLabel={i18n._('Last use')}>{lastUse(token)}</Td>
            <Td dataLabel={i18n._('Expires')}>{expiry(token)}</Td>
            <Td className="row-actions">
              <Button
                variant="link"
                isInline
                aria-label={i18n._('Revoke {name}', { name: token.name })}
                onClick={() => {
                  onRevoke(token);
                }}
              >
                {i18n._('Revoke')}
              </Button>
            </Td>
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

/** The tokens with which programs call the box. */
export function Tokens() {
  const tokens = useRead('VORN.Server.Token/v1/list', {});
  const [creating, setCreating] = useState(false);
  const [revoked, setRevoked] = useState<Token | null>(null);
  return (
    <section>
      <div className="page-head">
        <Title headingLevel="h2">{i18n._('Tokens')}</Title>
        <Button
          variant="secondary"
          onClick={() => {
            setCreating(true);
          }}
        >
          {i18n._('Create a token')}
        </Button>
      </div>
      <Loaded query={tokens}>{({ data }) => <TokenTable tokens={data} onRevoke={setRevoked} />}</Loaded>
      {creating && (
        <CreateToken
          onClose={() => {
            setCreating(false);
          }}
        />
      )}
      {revoked && (
        <ConfirmDialog
          title={i18n._('Revoke {name}?', { name: revoked.name })}
          confirm={i18n._('Revoke')}
          done={i18n._('The token was revoked')}
          change={{ method: 'VORN.Server.Token/v1/revoke', parameters: { id: revoked.id }, tag: null }}
          onClose={() => {
            setRevoked(null);
          }}
        >
          <Content component="p">
            {i18n._('Programs that use it are refused from now on. This cannot be undone.')}
          </Content>
        </ConfirmDialog>
      )}
    </section>
  );
}
