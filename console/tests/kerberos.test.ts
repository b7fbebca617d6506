import { expect, test } from 'vitest';
import { isWeak } from '../src/pages/kerberos';

test.each([
  ['des-cbc-crc', true],
  ['des3-cbc-sha1', true],
  ['arcfour-hmac', true],
  ['DEPRECATED:arcfour-hmac', true],
  ['aes256-cts-hmac-sha1-96', false],
  ['camellia256-cts-cmac', false],
])('%s is weak: %s', (type, weak) => {
  expect(isWeak(type)).toBe(weak);
});
