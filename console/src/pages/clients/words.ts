// Words for the facts that the box knows of a client.
import { i18n } from '@lingui/core';
import type { Data } from '../../api/call';
import { time } from '../../shared/words';

export type Client = Data<'VORN.Core.FileServ.NFS.Client/v1/list'>['clients'][number];
export type ClientExport = Client['exports'][number];
export type Refusal = Client['refusals'][number];

interface State {
  text: string;
  color: 'green' | 'orange' | 'grey' | 'red';
  /** What the text means, if that is not clear. */
  meaning?: string;
}

const STATES: Record<string, State> = {
  confirmed: { text: /*i18n*/ 'connected', color: 'green' },
  unconfirmed: { text: /*i18n*/ 'connecting', color: 'grey' },
  courtesy: {
    text: /*i18n*/ 'silent',
    color: 'orange',
    meaning:
      /*i18n*/ 'The client has not been heard of for long. The box keeps its files and locks until somebody needs them.',
  },
  expirable: {
    text: /*i18n*/ 'silent',
    color: 'orange',
    meaning: /*i18n*/ 'The client has not been heard of for long, and somebody needs what it has locked.',
  },
  connected: { text: /*i18n*/ 'connected', color: 'green' },
  mounted: {
    text: /*i18n*/ 'not connected',
    color: 'grey',
    meaning: /*i18n*/ 'A mount of NFSv3 is recorded, and there is no connection. The client may be gone for long.',
  },
  refused: { text: /*i18n*/ 'turned away', color: 'red' },
};

export function stateOf({ state }: Client): State {
  const known = state === null ? undefined : STATES[state];
  if (!known) return { text: state ?? i18n._('unknown'), color: 'grey' };
  return { ...known, text: i18n._(known.text), ...(known.meaning && { meaning: i18n._(known.meaning) }) };
}

/** The state of a client of NFSv4, which ends with a disconnection; null if it has none. */
export const identityOf = ({ id, client_id: clientId }: Client) =>
  id !== null && clientId !== null ? { id, client_id: clientId } : null;

/** How a sentence calls the client. */
export const nameOf = ({ address, name }: Client) => address ?? name ?? i18n._('unknown');

/** A key of its row. Several clients may have one address. */
export const keyOf = ({ address, name, client_id: clientId }: Client) => [clientId, address, name].join(' ');

export const versionOf = ({ version }: Client) => (version === null ? i18n._('Version unknown') : `NFSv${version}`);

/** A number that the box sees of clients of NFSv4 only. */
export function countOf(client: Client, count: number | null): string {
  if (count !== null) return i18n.number(count);
  return client.state === 'refused' ? i18n._('none') : i18n._('not visible');
}

export const timeOr = (seconds: number | null) => (seconds === null ? i18n._('unknown') : time(seconds));

const REASONS: Record<Refusal['reason'], string> = {
  no_rule: /*i18n*/ 'No rule admits this client.',
  not_exported: /*i18n*/ 'No rule of this folder admits this client.',
  port: /*i18n*/ 'The client asked from a port above 1023, and the rule demands one below.',
  path: /*i18n*/ 'The box shares no such folder.',
};

export const reasonOf = ({ reason }: Refusal) => i18n._(REASONS[reason]);

/** How often a client was turned away, and when last; empty if this is not known. */
export function timesOf({ count, last }: Refusal): string {
  if (count === null) return last === null ? '' : i18n._('last: {time}', { time: time(last) });
  const often = i18n._('{n, plural, one {once} other {# times}}', { n: count });
  return last === null ? often : i18n._('{often}, last: {time}', { often, time: time(last) });
}
