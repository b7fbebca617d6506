// The rights of all clients of one shared folder, side by side: who can get in.
import { i18n } from '@lingui/core';
import { Button, Content, Label, Title } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../../api/call';
import { Pager, usePages } from '../../shared/list';
import { Loaded } from '../../shared/page';
import { rightsOf } from './rights';

type Client = Data<'VORN.Core.FileServ.NFS.Access/v1/matrix'>['clients'][number];

const FLAVORS = ['sys', 'krb5', 'krb5i', 'krb5p'] as const;

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
      <Td className="row-actions">
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
  const pages = usePages('VORN.Core.FileServ.NFS.Access/v1/matrix', { share });
  const title = i18n._('Who can get into {share}', { share });
  return (
    <section>
      <Title headingLevel="h3">{title}</Title>
      <Content component="p">
        {i18n._(
          'For each kind of security that a client may mount with: sys believes the user IDs of the client; with krb5, krb5i and krb5p Kerberos proves who the users are.',
        )}
      </Content>
      <Loaded query={pages.list}>
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
              <Pager label={i18n._('Pages of the clients')} total={data.total} pages={pages} />
            </>
          )
        }
      </Loaded>
    </section>
  );
}
