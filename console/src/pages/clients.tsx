import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, EmptyState, ExpandableSection, List, ListItem } from '@patternfly/react-core';
import { ListToolbar, Pager, useFilter, usePages } from '../shared/list';
import { Loaded, PageFrame, ReadOnlyNotice } from '../shared/page';
import { ClientDetails } from './clients/details';
import { Disconnect } from './clients/disconnect';
import { ClientTable, type Chosen } from './clients/table';

/** What nobody can read from the list, so that nobody reads it into the list. */
function Unseen() {
  return (
    <ExpandableSection toggleText={i18n._('What the box cannot see')}>
      <List>
        <ListItem>{i18n._('Open files and locks of clients of NFSv3.')}</ListItem>
        <ListItem>
          {i18n._('Whether a client of NFSv3 without a connection still uses its mount. It may be gone for long.')}
        </ListItem>
        <ListItem>{i18n._('Bytes of one client, if a rule admits several. They are counted for each rule.')}</ListItem>
        <ListItem>
          {i18n._(
            'Clients that a firewall, a Kerberos ticket or the permissions of a folder kept out. The access check tells why.',
          )}
        </ListItem>
        <ListItem>{i18n._('Mounts of NFSv3 that were refused more than a day ago.')}</ListItem>
      </List>
    </ExpandableSection>
  );
}

export default function ClientsPage() {
  const filter = useFilter();
  const [chosen, setChosen] = useState<Chosen | null>(null);
  const pages = usePages('VORN.Core.FileServ.NFS.Client/v1/list', { filter: filter.value });
  const clients = pages.list;
  const search = (text: string) => {
    filter.set(text);
    pages.turn(1);
  };
  const close = () => {
    setChosen(null);
  };
  const total = clients.data?.data.total;
  return (
    <PageFrame
      title={i18n._('Clients')}
      purpose={i18n._('Who uses the shared folders at the moment, and who was turned away and why.')}
    >
      <ReadOnlyNotice />
      <ListToolbar
        label={i18n._('Search by client, version or folder')}
        filter={{ ...filter, set: search }}
        count={total}
      >
        <Button variant="secondary" isLoading={clients.isFetching} onClick={() => void clients.refetch()}>
          {i18n._('Refresh')}
        </Button>
      </ListToolbar>
      <Loaded query={clients}>
        {({ data }) =>
          data.clients.length === 0 ? (
            <EmptyState
              headingLevel="h2"
              titleText={filter.text ? i18n._('No client matches') : i18n._('No client is connected')}
            />
          ) : (
            <>
              <Content component="p">
                {i18n._('{n, plural, one {# client} other {# clients}}', { n: data.total })}
              </Content>
              <ClientTable clients={data.clients} onChoose={setChosen} />
              <Pager label={i18n._('Pages of the clients')} total={data.total} pages={pages} />
            </>
          )
        }
      </Loaded>
      <Unseen />
      {chosen?.wish === 'show' && <ClientDetails client={chosen.client} onClose={close} />}
      {chosen?.wish === 'disconnect' && <Disconnect client={chosen.client} onClose={close} />}
    </PageFrame>
  );
}
