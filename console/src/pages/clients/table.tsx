import { i18n } from '@lingui/core';
import { Button, Label } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import { useMayWrite } from '../../session/session';
import { time } from '../../shared/words';
import {
  countOf,
  identityOf,
  keyOf,
  nameOf,
  reasonOf,
  stateOf,
  timesOf,
  versionOf,
  type Client,
  type Refusal,
} from './words';

export interface Chosen {
  client: Client;
  wish: 'show' | 'disconnect';
}

/** What the client asked for and did not get, and why. */
function RefusalText({ refusal }: { refusal: Refusal }) {
  return (
    <div>
      {refusal.path !== null && (
        <>
          <code>{refusal.path}</code>{' '}
          <Label isCompact color="red">
            {i18n._('turned away')}
          </Label>{' '}
        </>
      )}
      {reasonOf(refusal)} {timesOf(refusal)}
    </div>
  );
}

/** The folders that the client uses, and those that it wanted. */
function Folders({ client }: { client: Client }) {
  if (client.exports.length + client.refusals.length === 0) return i18n._('none in the last half hour');
  return (
    <>
      {client.exports.map(({ path }) => (
        <div key={path}>
          <code>{path}</code>
        </div>
      ))}
      {client.refusals.map((refusal) => (
        <RefusalText key={`${refusal.reason} ${refusal.path ?? ''}`} refusal={refusal} />
      ))}
    </>
  );
}

function Actions({ client, onChoose }: { client: Client; onChoose: (chosen: Chosen) => void }) {
  const mayWrite = useMayWrite();
  const button = (wish: Chosen['wish'], text: string, label: string) => (
    <Button
      variant="link"
      isInline
      aria-label={label}
      onClick={() => {
        onChoose({ client, wish });
      }}
    >
      {text}
    </Button>
  );
  const name = nameOf(client);
  return (
    <>
      {button('show', i18n._('Details'), i18n._('Details of {name}', { name }))}{' '}
      {mayWrite &&
        identityOf(client) &&
        button('disconnect', i18n._('Disconnect'), i18n._('Disconnect {name}', { name }))}
    </>
  );
}

function Row({ client, onChoose }: { client: Client; onChoose: (chosen: Chosen) => void }) {
  const state = stateOf(client);
  return (
    <Tr>
      <Td dataLabel={i18n._('Client')}>
        <div>{nameOf(client)}</div>
        {client.address !== null && client.name !== null && <small>{client.name}</small>}
      </Td>
      <Td dataLabel={i18n._('State')}>
        <Label isCompact color={state.color}>
          {state.text}
        </Label>
        {client.state !== 'refused' && <div>{versionOf(client)}</div>}
        {client.since !== null && <small>{i18n._('since {time}', { time: time(client.since) })}</small>}
      </Td>
      <Td dataLabel={i18n._('Folders')}>
        <Folders client={client} />
      </Td>
      <Td dataLabel={i18n._('Open files')}>{countOf(client, client.open_files)}</Td>
      <Td dataLabel={i18n._('Locks')}>{countOf(client, client.locks)}</Td>
      <Td className="row-actions">
        <Actions client={client} onChoose={onChoose} />
      </Td>
    </Tr>
  );
}

export function ClientTable({ clients, onChoose }: { clients: Client[]; onChoose: (chosen: Chosen) => void }) {
  return (
    <Table aria-label={i18n._('Clients')} variant="compact" gridBreakPoint="grid-lg">
      <Thead>
        <Tr>
          <Th>{i18n._('Client')}</Th>
          <Th>{i18n._('State')}</Th>
          <Th>{i18n._('Folders')}</Th>
          <Th modifier="wrap">{i18n._('Open files')}</Th>
          <Th modifier="wrap">{i18n._('Locks')}</Th>
          <Th screenReaderText={i18n._('Actions')} />
        </Tr>
      </Thead>
      <Tbody>
        {clients.map((client) => (
          <Row key={keyOf(client)} client={client} onChoose={onChoose} />
        ))}
      </Tbody>
    </Table>
  );
}
