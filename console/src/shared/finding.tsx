// A finding of the health check, in words. The server's own sentences name the files, clients and rules that it is about.
import type { ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { Alert, Content } from '@patternfly/react-core';

export interface Finding {
  kind: string;
  severity: 'error' | 'warning' | 'notice';
  text: string;
  remedy: string;
}

const VARIANTS = { error: 'danger', warning: 'warning', notice: 'info' } as const;

const SEVERITIES: Record<Finding['severity'], string> = {
  error: /*i18n*/ 'Error',
  warning: /*i18n*/ 'Warning',
  notice: /*i18n*/ 'Notice',
};

const TITLES: Record<string, string> = {
  not_serving: /*i18n*/ 'NFS is switched on and does not serve',
  closed_port: /*i18n*/ 'A packet filter keeps clients out',
  full_file_system: /*i18n*/ 'A file system is full',
  exports_not_in_force: /*i18n*/ 'The service uses other rules than the files have',
  exports_fault: /*i18n*/ 'A line of exports(5) is faulty',
  settings_fault: /*i18n*/ 'A configuration file cannot be read',
  ignored_setting: /*i18n*/ 'A setting is ignored',
  overridden_setting: /*i18n*/ 'Another file overrides a setting',
  version_not_in_force: /*i18n*/ 'A version of NFS waits for a restart',
  unknown_host: /*i18n*/ 'The host of a rule has no address',
  moved_host: /*i18n*/ 'The host of a rule has another address',
  missing_folder: /*i18n*/ 'A shared folder is missing',
  left_share: /*i18n*/ 'A folder is exported and no longer shared',
  foreign_export: /*i18n*/ 'Another file exports a shared folder',
  linked_export: /*i18n*/ 'A shared folder is exported by a symbolic link',
  narrow_network: /*i18n*/ 'A rule admits fewer clients than it seems to',
  hidden_rule: /*i18n*/ 'A rule has no effect',
  crossed_volume: /*i18n*/ 'A rule opens a volume to further clients',
  nested_share: /*i18n*/ 'The rules of an outer folder decide',
  shared_file_system: /*i18n*/ 'Shared folders with different clients are on one file system',
  mapping_to_nobody: /*i18n*/ 'A principal is mapped to nobody',
  mapping_to_root: /*i18n*/ 'A principal is mapped to the superuser',
  mapping_without_effect: /*i18n*/ 'ID mappings have no effect',
  missing_keytab: /*i18n*/ 'Kerberos is demanded, and there is no keytab',
  missing_host_key: /*i18n*/ 'The keytab has no key for the name of the box',
  weak_key: /*i18n*/ 'The keytab has a weak key',
  outdated_key: /*i18n*/ 'The keytab has other keys than the KDC',
  refused_ticket: /*i18n*/ 'Kerberos tickets of clients were refused',
  unsynchronised_clock: /*i18n*/ 'The clock may be wrong',
  clock_skew: /*i18n*/ 'The clock differs from the one of the KDC',
  foreign_domain: /*i18n*/ 'A client is in another domain than the box',
  expiring_certificate: /*i18n*/ 'The certificate of the web API expires',
};

/** What was found, in the language of the page. A server may be newer than the page and find more. */
function titleOf({ kind, text }: Finding): string {
  const title = TITLES[kind];
  return title ? i18n._(title) : text;
}

/** A finding, and what can be done about it. */
export function FindingAlert({ finding, actions }: { finding: Finding; actions?: ReactNode }) {
  return (
    <Alert
      variant={VARIANTS[finding.severity]}
      isInline
      component="h3"
      title={titleOf(finding)}
      variantLabel={i18n._(SEVERITIES[finding.severity])}
      actionLinks={actions}
    >
      <Content component="p" lang="en">
        {finding.text}
      </Content>
      <Content component="p" lang="en">
        {finding.remedy}
      </Content>
    </Alert>
  );
}
