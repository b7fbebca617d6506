// The meaning of the client of an export rule, as exports(5) describes it.

export type ClientKind = 'empty' | 'everybody' | 'netgroup' | 'pattern' | 'network' | 'address' | 'name' | 'faulty';

export interface Network {
  bits: 32 | 128;
  address: bigint;
  prefix: number;
}

export interface Client {
  kind: ClientKind;
  /** Of addresses and networks. */
  network?: Network;
}

const FORBIDDEN = /[()|= '"\s]/;

function parseV4(text: string): bigint | null {
  const parts = text.split('.');
  if (parts.length !== 4 || !parts.every((part) => /^\d{1,3}$/.test(part) && Number(part) <= 255)) return null;
  return parts.reduce((value, part) => value * 256n + BigInt(part), 0n);
}

function parseV6(text: string): bigint | null {
  if (!/^[0-9a-f:.]+$/i.test(text) || !text.includes(':')) return null;
  const halves = text.split('::');
  if (halves.length > 2) return null;
  const groupsOf = (half: string) => (half === '' ? [] : half.split(':'));
  const [head = [], tail = []] = halves.map(groupsOf);
  const missing = 8 - head.length - tail.length;
  if (halves.length === 1 ? missing !== 0 : missing < 1) return null;
  const groups = [...head, ...Array<string>(halves.length === 1 ? 0 : missing).fill('0'), ...tail];
  if (!groups.every((group) => /^[0-9a-f]{1,4}$/i.test(group))) return null;
  return groups.reduce((value, group) => value * 65536n + BigInt(`0x${group}`), 0n);
}

/** The length of a netmask: 24 for 255.255.255.0; null if the bits are not contiguous. */
function prefixOfMask(mask: bigint): number | null {
  const inverse = mask ^ 0xffffffffn;
  return (inverse & (inverse + 1n)) === 0n ? 32 - inverse.toString(2).replace(/^0$/, '').length : null;
}

function parsePrefix(text: string, bits: number): number | null {
  if (/^\d{1,3}$/.test(text)) return Number(text) <= bits ? Number(text) : null;
  const mask = bits === 32 ? parseV4(text) : null;
  return mask === null ? null : prefixOfMask(mask);
}

/** An address, or a network as "10.0.0.0/8" or "10.0.0.0/255.0.0.0"; null if the text is neither. */
export function parseNetwork(text: string): Network | null {
  const [head = '', tail, ...more] = text.split('/');
  if (more.length > 0) return null;
  const v4 = parseV4(head);
  const bits = v4 === null ? 128 : 32;
  const address = v4 ?? parseV6(head);
  const prefix = tail === undefined ? bits : parsePrefix(tail, bits);
  return address === null || prefix === null ? null : { bits, address, prefix };
}

export function parseClient(text: string): Client {
  if (text === '') return { kind: 'empty' };
  if (FORBIDDEN.test(text)) return { kind: 'faulty' };
  if (text === '*') return { kind: 'everybody' };
  if (text.startsWith('@')) return { kind: text.length > 1 ? 'netgroup' : 'faulty' };
  const network = parseNetwork(text);
  if (network) return { kind: network.prefix === network.bits ? 'address' : 'network', network };
  if (text.includes('/') || text.includes(':') || /^[\d.]+$/.test(text)) return { kind: 'faulty' };
  return { kind: /[*?[]/.test(text) ? 'pattern' : 'name' };
}

/** The number of addresses of a network. */
export const addressCount = ({ bits, prefix }: Network): bigint => 1n << BigInt(bits - prefix);

/** Whether `outer` has every address of `inner`. */
export function contains(outer: Network, inner: Network): boolean {
  if (outer.bits !== inner.bits || outer.prefix > inner.prefix) return false;
  const shift = BigInt(outer.bits - outer.prefix);
  return outer.address >> shift === inner.address >> shift;
}

// The server looks at the kinds in this order, and within a kind at the rules in their order.
const ORDER: ClientKind[] = ['name', 'address', 'network', 'pattern', 'netgroup', 'everybody'];
const rank = (kind: ClientKind) => (kind === 'address' ? ORDER.indexOf('name') : ORDER.indexOf(kind));

export interface Overlap {
  /** The index of the other rule. */
  other: number;
  /** Whether the other rule decides for the clients of both. */
  otherDecides: boolean;
}

/** The rules that have clients in common with the rule `index`, as far as their texts tell. */
export function overlaps(clients: string[], index: number): Overlap[] {
  const own = parseClient(clients[index] ?? '');
  if (own.kind === 'empty' || own.kind === 'faulty') return [];
  return clients.flatMap((text, other) => {
    const client = parseClient(text);
    if (other === index || client.kind === 'empty' || client.kind === 'faulty') return [];
    if (!mayShare(own, clients[index] ?? '', client, text)) return [];
    const byKind = rank(client.kind) - rank(own.kind);
    return [{ other, otherDecides: byKind === 0 ? other < index : byKind < 0 }];
  });
}

function mayShare(a: Client, aText: string, b: Client, bText: string): boolean {
  if (a.kind === 'everybody' || b.kind === 'everybody') return true;
  if (a.network && b.network) return contains(a.network, b.network) || contains(b.network, a.network);
  return aText.toLowerCase() === bText.toLowerCase();
}
