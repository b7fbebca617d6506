import { i18n } from '@lingui/core';
import { Card, CardBody, CardTitle, Content, DescriptionList, Gallery, Label } from '@patternfly/react-core';
import { DescriptionItem } from '../shared/description-item';
import { Loaded, PageFrame, ReadOnlyNotice } from '../shared/page';
import { useRead } from '../shared/use-read';
import { ChangeTable } from './changes';
import { Health } from './health';
import { ThroughputCard } from './overview/throughput';

function OnOff({ on }: { on: boolean }) {
  return <Label color={on ? 'green' : 'grey'}>{on ? i18n._('On') : i18n._('Off')}</Label>;
}

function ServiceCard() {
  const service = useRead('VORN.Core.FileServ.NFS/v1/get', {});
  const kerberos = useRead('VORN.Core.FileServ.NFS.Kerberos/v1/get', {});
  return (
    <Card>
      <CardTitle component="h2">{i18n._('Service')}</CardTitle>
      <CardBody>
        <Loaded query={service}>
          {({ data }) => (
            <DescriptionList isCompact isHorizontal>
              <DescriptionItem term={i18n._('NFS service')}>
                <OnOff on={data.enable_nfs} /> {!data.enable_nfs && <a href="#/service">{i18n._('Switch it on')}</a>}
              </DescriptionItem>
              <DescriptionItem term={i18n._('NFSv4')}>
                <OnOff on={data.enable_nfs_v4} />
              </DescriptionItem>
              <DescriptionItem term={i18n._('NFSv4 domain')}>{data.nfs_v4_domain || i18n._('none')}</DescriptionItem>
              <DescriptionItem term={i18n._('Kerberos principal')}>
                <Loaded query={kerberos}>{(answer) => answer.data.kerberos_principal || i18n._('none')}</Loaded>
              </DescriptionItem>
            </DescriptionList>
          )}
        </Loaded>
      </CardBody>
    </Card>
  );
}

function SharesCard() {
  const shares = useRead('VORN.Core.Share/v1/list', {});
  return (
    <Card>
      <CardTitle component="h2">{i18n._('Shared folders')}</CardTitle>
      <CardBody>
        <Loaded query={shares}>
          {({ data }) => {
            const open = data.shares.filter((share) => share.rules > 0).length;
            return (
              <>
                <Content component="p">
                  {i18n._(
                    '{n, plural, =0 {No folder has rules for clients.} one {# folder of {total} has rules for clients.} other {# folders of {total} have rules for clients.}}',
                    { n: open, total: data.total },
                  )}
                </Content>
                <a href="#/shares">{i18n._('Show the shared folders')}</a>
              </>
            );
          }}
        </Loaded>
      </CardBody>
    </Card>
  );
}

/** To whom the service serves. */
function ClientsCard() {
  const clients = useRead('VORN.Core.FileServ.NFS.Client/v1/list', {});
  return (
    <Card>
      <CardTitle component="h2">{i18n._('Clients')}</CardTitle>
      <CardBody>
        <Loaded query={clients}>
          {({ data }) => {
            const count = (...states: string[]) =>
              data.clients.filter(({ state }) => states.includes(state ?? '')).length;
            const refused = count('refused');
            return (
              <>
                <Content component="p">
                  {i18n._(
                    '{n, plural, =0 {No client is connected.} one {# client is connected.} other {# clients are connected.}}',
                    { n: count('confirmed', 'connected') },
                  )}{' '}
                  {refused > 0 &&
                    i18n._('{n, plural, one {# client was turned away.} other {# clients were turned away.}}', {
                      n: refused,
                    })}
                </Content>
                <a href="#/clients">{i18n._('Show the clients')}</a>
              </>
            );
          }}
        </Loaded>
      </CardBody>
    </Card>
  );
}

function HealthCard() {
  return (
    <Card>
      <CardTitle component="h2">{i18n._('What needs attention')}</CardTitle>
      <CardBody>
        <Health />
      </CardBody>
    </Card>
  );
}

function ChangesCard() {
  const changes = useRead('VORN.Core.FileServ.NFS.History/v1/list', { limit: 5 });
  return (
    <Card>
      <CardTitle component="h2">{i18n._('Last changes')}</CardTitle>
      <CardBody>
        <Loaded query={changes}>
          {({ data }) =>
            data.changes.length === 0 ? (
              <Content component="p">{i18n._('Nothing has been changed yet.')}</Content>
            ) : (
              <>
                <ChangeTable changes={data.changes} label={i18n._('Last changes')} />
                <a href="#/history">{i18n._('Show the whole history')}</a>
              </>
            )
          }
        </Loaded>
      </CardBody>
    </Card>
  );
}

export default function OverviewPage() {
  return (
    <PageFrame
      title={i18n._('Overview')}
      purpose={i18n._('Whether NFS serves, and to whom; what is wrong, and what was changed last.')}
    >
      <div className="stack">
        <ReadOnlyNotice />
        <Gallery hasGutter minWidths={{ default: 'min(18rem, 100%)' }}>
          <ServiceCard />
          <SharesCard />
          <ClientsCard />
        </Gallery>
        <HealthCard />
        <ThroughputCard />
        <ChangesCard />
      </div>
    </PageFrame>
  );
}
