import { i18n } from '@lingui/core';

/** What a client may do in a folder, in words. */
export function rightsOf({ mountable, read, write }: { mountable: boolean; read: boolean; write: boolean }): string {
  if (!mountable) return i18n._('cannot mount');
  if (write) return i18n._('read and write');
  return read ? i18n._('read only') : i18n._('can mount, but not read');
}
