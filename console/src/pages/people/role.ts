import { i18n } from '@lingui/core';

export const ROLES = { reader: /*i18n*/ 'Reader', administrator: /*i18n*/ 'Administrator' } as const;
export type Role = keyof typeof ROLES;

export const roleText = (role: Role) => i18n._(ROLES[role]);
