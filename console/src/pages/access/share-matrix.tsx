// The rights of all clients of one shared folder, side by side: who can get in.
import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, Label, Title } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../../api/call';
import { Pager } from '../../shared/list';
import { Loaded } from '../../shared/page';
import { useRead } from '../../shared/use-read';
import { rightsOf } from './rights';

type Client = Data<'VORN.Core.FileServ.NFS.Access/v1/matrix'>['clients'][number];

const FLAVORS = ['sys', 'krb5', 'krb5i', 'krb5p'] as const;
const PAGE_SIZE = 20;

function Row({ client, onAsk }: { client: Client; onAsk: (client: Client) => void }) {
  return (
    <Tr>
      <Td dataLabel={i18n._('Client')}>
        <code>{client.client}</code> {client.state !== null && <Label isCompact>{i18n._('in use')}</Label>}
        {client.text !== null && <small lang="en"> {client.text}</small>}
      </Td>
      {FLAVORS.map((name) => {
        const rights = client.flavors.find(({ flavor }) => flavor === name);
        return (
          <Td key={name} dataLabel={name}>
            {rights ? rightsOf(rights) : i18n._('unknown')}
          </Td>
        );
      })}
      <Td isActionCell>
        {client.address !== null && (
          <Button
            variant="link"
            isInline
            aria-label={i18n._('Why has {client} these rights?', { client: client.client })}
            onClick={() => {
              onAsk(client);
            }}
          >
            {i18n._('Why?')}
          </Button>
        )}
      </Td>
    </Tr>
  );
}

/** The clients of the rules of a folder, and those that are connected, with their rights for each security flavour. */
export function ShareMatrix({ share, onAsk }: { share: string; onAsk: (client: Client) => void }) {
  const [page, setPage] = useState(1);
  const matrix = useRead(
    'VORN.Core.FileServ.NFS.Access/v1/matrix',
    { share, offset: (page - 1) * PAGE_SIZE, limit: PAGE_SIZE },
    { keepsPrevious: true },
  );
  const title = i18n._('Who can get into {share}', { share });
  return (
    <section>
      <Title headingLevel="h2">{title}</Title>
      <Loaded query={matrix}>
        {({ data }) =>
          data.clients.length === 0 ? (
            <Content component="p">
              {i18n._('No rule of this folder admits a client, and no client is connected.')}
            </Content>
          ) : (
            <>
              <Table aria-label={title} variant="compact" gridBreakPoint="grid-lg">
                <Thead>
                  <Tr>
                    <Th>{i18n._('Client')}</Th>
                    {FLAVORS.map((flavor) => (
                      <Th key={flavor}>{flavor}</Th>
                    ))}
                    <Th screenReaderText={i18n._('Actions')} />
                  </Tr>
                </Thead>
                <Tbody>
                  {data.clients.map((client) => (
                    <Row
                      key={`${client.client} ${client.address ?? ''} ${client.version}`}
                      client={client}
                      onAsk={onAsk}
                    />
                  ))}
                </Tbody>
              </Table>
              <Pager
                label={i18n._('Pages of the clients')}
                total={data.total}
                size={PAGE_SIZE}
                page={page}
                onTurn={setPage}
              />
            </>
          )
        }
      </Loaded>
    </section>
  );
}
