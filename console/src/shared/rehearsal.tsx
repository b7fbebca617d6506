import type { ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { Alert, Content, Label, List, ListItem, Title } from '@patternfly/react-core';
import type { Rehearsal } from '../api/call';
import { Difference } from './difference';
import { FindingAlert } from './finding';

type Action = Rehearsal['actions'][number];
type RuleChange = Rehearsal['rules'][number]['changes'][number];

const ACTIONS: Record<Action['action'], string> = {
  start: /*i18n*/ 'The NFS service is started.',
  stop: /*i18n*/ 'The NFS service is stopped.',
  restart: /*i18n*/ 'The NFS service is restarted.',
  reload: /*i18n*/ 'The NFS service reads its export rules again.',
  refresh_names: /*i18n*/ 'The NFS service looks up the names of clients again.',
  transfer_sizes: /*i18n*/ 'The transfer sizes are handed to the NFS service.',
  unix_permissions: /*i18n*/ 'The lookup of groups is handed to the NFS service.',
  reload_identities: /*i18n*/ 'The NFS service reads its ID mappings again.',
  firewall: /*i18n*/ 'The firewall opens and closes ports.',
  disconnect: /*i18n*/ 'The client is disconnected.',
};

const NOTICES: Record<Action['clients'], string> = {
  nothing: /*i18n*/ 'Clients notice nothing.',
  reload: /*i18n*/ 'Clients get their new rights without an interruption.',
  restart: /*i18n*/ 'Clients wait until the service is there again.',
  start: /*i18n*/ 'Clients can mount from then on.',
  stop: /*i18n*/ 'Clients lose the access to their mounts.',
  disconnect: /*i18n*/ 'The client loses its open files and locks.',
};

const CHANGES: Record<RuleChange['change'], string> = {
  removed: /*i18n*/ 'loses the access',
  added: /*i18n*/ 'gets access',
  flavor_removed: /*i18n*/ 'may no longer mount with this security',
  flavor_added: /*i18n*/ 'may mount with this security',
  other_account: /*i18n*/ 'acts as another account',
  other_options: /*i18n*/ 'gets other options',
  read_only: /*i18n*/ 'may only read',
  read_write: /*i18n*/ 'may read and write',
  root_squashed: /*i18n*/ 'its root user loses the rights of root',
  root_not_squashed: /*i18n*/ 'its root user gets the rights of root',
  all_squashed: /*i18n*/ 'all its users act as one account',
  all_not_squashed: /*i18n*/ 'its users act as themselves',
  any_port: /*i18n*/ 'may use any port',
  reserved_ports_only: /*i18n*/ 'must use a port below 1024',
  crossmnt: /*i18n*/ 'may enter file systems below the folder',
  no_crossmnt: /*i18n*/ 'may not enter file systems below the folder',
  async: /*i18n*/ 'gets answers before the data is on disk',
  sync: /*i18n*/ 'gets answers when the data is on disk',
};

const COLORS = { less: 'red', more: 'orange', other: 'grey' } as const;

const ACCESS: Record<RuleChange['access'], string> = {
  less: /*i18n*/ 'less access',
  more: /*i18n*/ 'more access',
  other: /*i18n*/ 'other access',
};

function noticeOf(action: Action): string {
  if (action.clients !== 'restart' || !action.grace_seconds) return i18n._(NOTICES[action.clients]);
  return i18n._('Clients wait; for {seconds} seconds they can open no further files and get no new locks.', {
    seconds: action.grace_seconds,
  });
}

function Actions({ actions }: { actions: Action[] }) {
  return (
    <section>
      <Title headingLevel="h2" size="md">
        {i18n._('The service')}
      </Title>
      {actions.length === 0 && (
        <Content component="p">{i18n._('The service is left alone. Clients notice nothing.')}</Content>
      )}
      <List>
        {actions.map((action, index) => (
          <ListItem key={index}>{`${i18n._(ACTIONS[action.action])} ${noticeOf(action)}`}</ListItem>
        ))}
      </List>
    </section>
  );
}

/** One change of the rights of a client, which `who` names. */
function RightsItem({ who, change }: { who: ReactNode; change: RuleChange }) {
  return (
    <ListItem>
      {who} {change.flavor && <Label isCompact>{change.flavor}</Label>} {i18n._(CHANGES[change.change])}{' '}
      <Label isCompact color={COLORS[change.access]}>
        {i18n._(ACCESS[change.access])}
      </Label>
    </ListItem>
  );
}

/** The directory of a rule, if the change concerns several. */
function Directory({ of: directory, among }: { of: string; among: string[] }) {
  if (among.every((each) => each === directory)) return null;
  return (
    <>
      {' '}
      <code>{directory}</code>
    </>
  );
}

function Rules({ rules }: { rules: Rehearsal['rules'] }) {
  if (rules.length === 0) return null;
  const directories = rules.map((rule) => rule.directory);
  return (
    <section>
      <Title headingLevel="h2" size="md">
        {i18n._('Rights of clients')}
      </Title>
      <List>
        {rules.flatMap((rule) =>
          rule.changes.map((change) => (
            <RightsItem
              key={[rule.directory, rule.client, change.change, change.flavor].join(' ')}
              who={
                <>
                  <code>{rule.client}</code>
                  <Directory of={rule.directory} among={directories} />
                </>
              }
              change={change}
            />
          )),
        )}
      </List>
    </section>
  );
}

function nameOf({ address, name, certain }: Rehearsal['clients'][number]): string {
  const text = name ? `${name} (${address})` : address;
  return certain ? text : i18n._('{client}, perhaps', { client: text });
}

/** The clients that use the folder at this moment. */
function Connected({ clients }: { clients: Rehearsal['clients'] }) {
  if (clients.length === 0) return null;
  const paths = clients.map((client) => client.path);
  return (
    <section>
      <Title headingLevel="h2" size="md">
        {i18n._('Clients that are connected now')}
      </Title>
      <List>
        {clients.flatMap((client) =>
          client.changes.map((change) => (
            <RightsItem
              key={[client.path, client.address, change.change, change.flavor].join(' ')}
              who={
                <>
                  <strong>{nameOf(client)}</strong>
                  <Directory of={client.path} among={paths} />
                </>
              }
              change={change}
            />
          )),
        )}
      </List>
      {clients.some((client) => !client.certain) && (
        <Content component="small">
          {i18n._('A rule for names of hosts may decide otherwise for some. No name service is asked beforehand.')}
        </Content>
      )}
    </section>
  );
}

/** What the health check will find, and will no longer find. */
function Findings({ findings }: { findings: NonNullable<Rehearsal['findings']> }) {
  const { added, removed } = findings;
  if (added.length + removed.length === 0) return null;
  return (
    <section>
      {added.length > 0 && (
        <Title headingLevel="h2" size="md">
          {i18n._('What the change leads to')}
        </Title>
      )}
      {added.map((finding) => (
        <FindingAlert key={`${finding.kind} ${finding.text}`} finding={finding} />
      ))}
      {removed.length > 0 && (
        <Title headingLevel="h2" size="md">
          {i18n._('What the change settles')}
        </Title>
      )}
      <List>
        {removed.map((finding) => (
          <ListItem key={`${finding.kind} ${finding.text}`} lang="en">
            {finding.text}
          </ListItem>
        ))}
      </List>
    </section>
  );
}

function Files({ files }: { files: Rehearsal['files'] }) {
  return (
    <section>
      <Title headingLevel="h2" size="md">
        {i18n._('Files')}
      </Title>
      {files.length === 0 && <Content component="p">{i18n._('No file is changed.')}</Content>}
      {files.map((file) => (
        <Difference key={file.path} {...file} />
      ))}
    </section>
  );
}

/** What a change would do, in words: to the service and its clients, and to the files of the box. */
export function RehearsalView({ rehearsal }: { rehearsal: Rehearsal }) {
  const { actions, rules, clients, files, findings } = rehearsal;
  if (actions.length + rules.length + files.length === 0) {
    return <Alert variant="info" isInline component="h2" title={i18n._('This changes nothing on the box.')} />;
  }
  return (
    <div className="rehearsal">
      {findings && <Findings findings={findings} />}
      <Actions actions={actions} />
      <Rules rules={rules} />
      <Connected clients={clients} />
      <Files files={files} />
    </div>
  );
}
