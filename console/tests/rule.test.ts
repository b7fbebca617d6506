import { expect, test } from 'vitest';
import { isComplete, mountCommand, newRule, toParameters, type StoredRule } from '../src/pages/shares/rule';

test('a new rule is cautious, and not complete without a client', () => {
  const rule = newRule(true);
  expect(rule).toMatchObject({ privilege: 'ro', root_squash: 'guest', async: false, insecure: false });
  expect(isComplete(rule)).toBe(false);
  expect(isComplete({ ...rule, client: 'host' })).toBe(true);
});

test('what the box could not express is not saved with an invented value', () => {
  const rule = { ...newRule(true), client: 'host' };
  const withoutPrivilege: StoredRule = { ...rule };
  delete withoutPrivilege.privilege;
  expect(toParameters([withoutPrivilege])).toBeNull();
  expect(toParameters([rule])).toEqual([rule]);
});

test('the mount command names the strongest security, and quotes for a shell', () => {
  const rule = { ...newRule(true), client: 'host' };
  expect(mountCommand(rule, 'box', '/v/data', 'data')).toBe('mount -t nfs box:/v/data /mnt/data');
  const strong = {
    ...rule,
    security_flavor: { sys: true, kerberos: true, kerberos_integrity: false, kerberos_privacy: false },
  };
  expect(mountCommand(strong, 'box', "/v/it's", 'a b')).toBe("mount -t nfs -o sec=krb5 'box:/v/it'\\''s' '/mnt/a b'");
});
