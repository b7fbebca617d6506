import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Alert, Checkbox, FormGroup } from '@patternfly/react-core';
import { ChoiceField, SwitchField, TextField } from '../../shared/fields';
import { FormDialog } from '../../shared/form-dialog';
import { addressCount, overlaps, parseClient } from './client';
import {
  FLAVORS,
  FLAVOR_TEXTS,
  flavorsOf,
  isComplete,
  PRIVILEGES,
  SQUASHES,
  type Flavor,
  type StoredRule,
} from './rule';

const choicesOf = <T extends string>(texts: Record<T, string>, isSet: boolean) => [
  ...(isSet ? [] : [{ value: '' as T, text: i18n._('Choose') }]),
  ...(Object.keys(texts) as T[]).map((value) => ({ value, text: i18n._(texts[value]) })),
];

/** What the typed client stands for. */
function clientHelp(text: string): string {
  const client = parseClient(text);
  switch (client.kind) {
    case 'empty':
      return i18n._(
        'A host name, an address, a network (10.0.0.0/24), a pattern (*.example.net), a netgroup (@name) or * for everybody.',
      );
    case 'everybody':
      return i18n._('Everybody who can reach the box.');
    case 'netgroup':
      return i18n._('All hosts of a netgroup.');
    case 'pattern':
      return i18n._('All hosts whose name matches. The box asks the name service for the name of each client.');
    case 'network':
      return i18n._('A network with {count} addresses.', {
        count: client.network ? i18n.number(addressCount(client.network)) : '',
      });
    case 'address':
      return i18n._('One address.');
    case 'name':
      return i18n._('One host, by its name. The name service must know it.');
    case 'faulty':
      return '';
  }
}

const clientFault = (text: string) =>
  parseClient(text).kind === 'faulty'
    ? i18n._(
        'This is no host name, address or network. Spaces, quotes, brackets and the characters | and = are not possible.',
      )
    : undefined;

/** Rules that concern the same clients, and which one decides. */
function Overlaps({ clients, index }: { clients: string[]; index: number }) {
  const found = overlaps(clients, index);
  if (found.length === 0) return null;
  return (
    <Alert variant="info" isInline component="h2" title={i18n._('Other rules are for the same clients')}>
      {found.map(({ other, otherDecides }) => (
        <p key={other}>
          {otherDecides
            ? i18n._('Rule {n} ({client}) decides for the clients of both.', { n: other + 1, client: clients[other] })
            : i18n._('This rule decides for the clients of rule {n} ({client}), too.', {
                n: other + 1,
                client: clients[other],
              })}
        </p>
      ))}
    </Alert>
  );
}

function SecurityGroup({ rule, onChange }: { rule: StoredRule; onChange: (part: Partial<StoredRule>) => void }) {
  const { security_flavor: flavors } = rule;
  if (!flavors) return null;
  const change = (flavor: Flavor, accepted: boolean) => {
    onChange({ security_flavor: { ...flavors, [flavor]: accepted } });
  };
  return (
    <FormGroup role="group" label={i18n._('Accepted security')} isStack fieldId="security" isRequired>
      {FLAVORS.map((flavor) => (
        <Checkbox
          key={flavor}
          id={`flavor-${flavor}`}
          label={i18n._(FLAVOR_TEXTS[flavor])}
          isChecked={flavors[flavor]}
          onChange={(_event, checked) => {
            change(flavor, checked);
          }}
        />
      ))}
      {flavorsOf(rule).length === 0 && (
        <Alert variant="warning" isInline isPlain component="h2" title={i18n._('Accept at least one.')} />
      )}
    </FormGroup>
  );
}

function OptionSwitches({ rule, onChange }: { rule: StoredRule; onChange: (part: Partial<StoredRule>) => void }) {
  return (
    <>
      <SwitchField
        label={i18n._('Answer before the data is on disk')}
        help={i18n._('Faster, but files are damaged if the box loses power.')}
        value={rule.async ?? false}
        onChange={(on) => {
          onChange({ async: on });
        }}
      />
      <SwitchField
        label={i18n._('Accept any port of the client')}
        help={i18n._('For clients that cannot use a port below 1024, for example in a virtual machine.')}
        value={rule.insecure}
        onChange={(on) => {
          onChange({ insecure: on });
        }}
      />
      <SwitchField
        label={i18n._('File systems below the folder, too')}
        help={i18n._('Clients may enter other file systems that are mounted below the folder.')}
        value={rule.crossmnt}
        onChange={(on) => {
          onChange({ crossmnt: on });
        }}
      />
    </>
  );
}

/** Edits the rule `index` of the rules of a folder. */
export function RuleForm({
  rule,
  clients,
  index,
  isNew,
  onDone,
  onClose,
}: {
  rule: StoredRule;
  /** The clients of all rules; the edited one's is ignored. */
  clients: string[];
  index: number;
  isNew: boolean;
  onDone: (rule: StoredRule) => void;
  onClose: () => void;
}) {
  const [value, setValue] = useState(rule.async === undefined ? { ...rule, async: false } : rule);
  const change = (part: Partial<StoredRule>) => {
    setValue({ ...value, ...part });
  };
  const isValid = isComplete(value) && !clientFault(value.client);
  return (
    <FormDialog
      id="edit-rule"
      title={isNew ? i18n._('New rule') : i18n._('Change the rule')}
      submit={isNew ? i18n._('Add the rule') : i18n._('Take over')}
      isValid={isValid}
      isWide
      onSubmit={() => {
        onDone(value);
      }}
      onClose={onClose}
    >
      <TextField
        label={i18n._('Client')}
        value={value.client}
        help={clientHelp(value.client)}
        error={clientFault(value.client)}
        isRequired
        onChange={(client) => {
          change({ client });
        }}
      />
      <Overlaps clients={clients.with(index, value.client)} index={index} />
      <ChoiceField
        label={i18n._('Access')}
        value={value.privilege ?? ''}
        choices={choicesOf<string>(PRIVILEGES, value.privilege !== undefined)}
        onChange={(privilege) => {
          change({ privilege: privilege as NonNullable<StoredRule['privilege']> });
        }}
      />
      <ChoiceField
        label={i18n._('Who the users of the client are on the box')}
        value={value.root_squash ?? ''}
        choices={choicesOf<string>(SQUASHES, value.root_squash !== undefined)}
        onChange={(squash) => {
          change({ root_squash: squash as NonNullable<StoredRule['root_squash']> });
        }}
      />
      <SecurityGroup rule={value} onChange={change} />
      <OptionSwitches rule={value} onChange={change} />
    </FormDialog>
  );
}
