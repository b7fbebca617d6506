import { i18n } from '@lingui/core';
import type { Data, Parameters } from '../../api/call';
import type { Fact } from '../../shared/conflict';

export type StoredRule = Data<'VORN.Core.FileServ.NFS.SharePrivilege/v1/load'>['rule'][number];
export type Rule = Parameters<'VORN.Core.FileServ.NFS.SharePrivilege/v1/save'>['rule'][number];
export type Flavors = StoredRule['security_flavor'];
export type Flavor = keyof NonNullable<Flavors>;

export const FLAVORS: Flavor[] = ['sys', 'kerberos', 'kerberos_integrity', 'kerberos_privacy'];

/** The names of flavours in exports(5) and in mount options. */
export const FLAVOR_NAMES: Record<Flavor, string> = {
  sys: 'sys',
  kerberos: 'krb5',
  kerberos_integrity: 'krb5i',
  kerberos_privacy: 'krb5p',
};

export const FLAVOR_TEXTS: Record<Flavor, string> = {
  sys: /*i18n*/ 'sys: the box believes the user IDs that the client sends',
  kerberos: /*i18n*/ 'krb5: Kerberos proves who the user is',
  kerberos_integrity: /*i18n*/ 'krb5i: and nobody can alter the data on its way',
  kerberos_privacy: /*i18n*/ 'krb5p: and nobody can read the data on its way',
};

export const PRIVILEGES = { rw: /*i18n*/ 'read and write', ro: /*i18n*/ 'read only' } as const;

export const SQUASHES = {
  root: /*i18n*/ 'Everybody as themselves, also root',
  admin: /*i18n*/ 'root as the administrator account',
  guest: /*i18n*/ 'root as the guest account',
  all_admin: /*i18n*/ 'All users as the administrator account',
} as const;

/** A cautious rule: read only, root without rights. */
export const newRule = (kerberos: boolean): StoredRule => ({
  client: '',
  privilege: 'ro',
  root_squash: 'guest',
  async: false,
  insecure: false,
  crossmnt: false,
  ...(kerberos && {
    security_flavor: { sys: true, kerberos: false, kerberos_integrity: false, kerberos_privacy: false },
  }),
});

export const flavorsOf = (rule: StoredRule): Flavor[] => FLAVORS.filter((flavor) => rule.security_flavor?.[flavor]);

/** Whether every member has a value, so that the rule can be saved. */
export const isComplete = (rule: StoredRule): boolean =>
  rule.client !== '' &&
  rule.privilege !== undefined &&
  rule.root_squash !== undefined &&
  rule.async !== undefined &&
  (rule.security_flavor === undefined || flavorsOf(rule).length > 0);

/** The rules as the method takes them; null if one of them is not complete. */
export function toParameters(rules: StoredRule[]): Rule[] | null {
  if (!rules.every(isComplete)) return null;
  return rules.map((rule) => ({ ...rule, security_flavor: rule.security_flavor ?? { sys: true } })) as Rule[];
}

/** How many rules a folder has, in words. */
export const ruleCount = (count: number) =>
  i18n._('{n, plural, =0 {no rules, nobody may mount it} one {# rule} other {# rules}}', { n: count });

export const privilegeText = ({ privilege }: StoredRule) =>
  privilege ? i18n._(PRIVILEGES[privilege]) : i18n._('not set');

export const squashText = ({ root_squash }: StoredRule) =>
  root_squash ? i18n._(SQUASHES[root_squash]) : i18n._('not set');

export const securityText = (rule: StoredRule) =>
  rule.security_flavor
    ? flavorsOf(rule)
        .map((flavor) => FLAVOR_NAMES[flavor])
        .join(', ')
    : 'sys';

/** The options that differ from the defaults, in words. */
export function optionsText(rule: StoredRule): string {
  const options = [
    rule.async === undefined && i18n._('writing: not set'),
    rule.async && i18n._('answers before the data is on disk'),
    rule.insecure && i18n._('any port'),
    rule.crossmnt && i18n._('file systems below, too'),
  ];
  return options.filter(Boolean).join('; ');
}

export const describe = (rules: StoredRule[]): Fact[] =>
  rules.map((rule, index) => ({
    label: i18n._('Rule {n}', { n: index + 1 }),
    text: [rule.client, privilegeText(rule), squashText(rule), securityText(rule), optionsText(rule)]
      .filter(Boolean)
      .join('; '),
  }));

/** The command with which a client of this rule mounts the folder. The strongest accepted flavour is named. */
export function mountCommand(rule: StoredRule, host: string, path: string, name: string): string {
  const flavor = flavorsOf(rule).at(-1) ?? 'sys';
  const options = flavor === 'sys' ? '' : `-o sec=${FLAVOR_NAMES[flavor]} `;
  const quoted = (text: string) => (/^[\w@%+=:,./[\]-]+$/.test(text) ? text : `'${text.replaceAll("'", "'\\''")}'`);
  return `mount -t nfs ${options}${quoted(`${host}:${path}`)} ${quoted(`/mnt/${name}`)}`;
}
