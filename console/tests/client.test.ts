import { expect, test } from 'vitest';
import { addressCount, contains, overlaps, parseClient, parseNetwork } from '../src/pages/shares/client';

const network = (text: string) => {
  const parsed = parseNetwork(text);
  if (!parsed) throw new Error(text);
  return parsed;
};

test.each([
  ['', 'empty'],
  ['*', 'everybody'],
  ['@farm', 'netgroup'],
  ['@', 'faulty'],
  ['*.example.net', 'pattern'],
  ['host[12].example.net', 'pattern'],
  ['host', 'name'],
  ['dump01.example.net', 'name'],
  ['10.0.0.1', 'address'],
  ['10.0.0.1/32', 'address'],
  ['10.0.0.0/24', 'network'],
  ['10.0.0.0/255.255.0.0', 'network'],
  ['10.0.0.0/255.0.255.0', 'faulty'],
  ['10.0.0.0/33', 'faulty'],
  ['10.0.0', 'faulty'],
  ['10.0.0.256', 'faulty'],
  ['2001:db8::1', 'address'],
  ['2001:db8::/32', 'network'],
  ['2001:db8::/129', 'faulty'],
  ['2001:db8:::1', 'faulty'],
  ['1::2::3', 'faulty'],
  ['host/24', 'faulty'],
  ['a b', 'faulty'],
  ['a(b', 'faulty'],
  ["a'b", 'faulty'],
  ['a=b', 'faulty'],
])('%j is of the kind %s', (text, kind) => {
  expect(parseClient(text).kind).toBe(kind);
});

test('networks have their numbers of addresses', () => {
  expect(addressCount(network('10.0.0.0/24'))).toBe(256n);
  expect(addressCount(network('10.0.0.0/255.255.255.252'))).toBe(4n);
  expect(addressCount(network('0.0.0.0/0'))).toBe(2n ** 32n);
  expect(addressCount(network('2001:db8::/64'))).toBe(2n ** 64n);
});

test('a network contains smaller ones of its own family', () => {
  expect(contains(network('10.0.0.0/8'), network('10.1.2.3'))).toBe(true);
  expect(contains(network('10.0.0.0/8'), network('11.0.0.0/16'))).toBe(false);
  expect(contains(network('10.0.0.0/16'), network('10.0.0.0/8'))).toBe(false);
  expect(contains(network('::/0'), network('10.0.0.0/8'))).toBe(false);
});

test('the earlier kind decides, and within a kind the earlier rule', () => {
  const clients = ['10.0.0.0/8', '10.0.0.0/24', '10.0.0.1', '*', 'x(', '192.168.0.1'];
  expect(overlaps(clients, 1)).toEqual([
    { other: 0, otherDecides: true },
    { other: 2, otherDecides: true },
    { other: 3, otherDecides: false },
  ]);
  expect(overlaps(clients, 0)[0]).toEqual({ other: 1, otherDecides: false });
  expect(overlaps(clients, 4)).toEqual([]);
});
