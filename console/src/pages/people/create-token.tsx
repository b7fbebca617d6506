import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Alert, Button, ClipboardCopy, Modal, ModalBody, ModalFooter, ModalHeader } from '@patternfly/react-core';
import { useChange } from '../../shared/change-dialog';
import { ChoiceField, TextField } from '../../shared/fields';
import { FormDialog } from '../../shared/form-dialog';
import { Problem } from '../../shared/problem';
import { ROLES, type Role } from './role';

const DAY = 86400; // seconds

const LIFETIMES = [
  { value: 30 * DAY, text: /*i18n*/ '30 days' },
  { value: 365 * DAY, text: /*i18n*/ 'One year' },
  { value: 0, text: /*i18n*/ 'It never expires' },
];

const namesIn = (text: string) =>
  text
    .split(',')
    .map((name) => name.trim())
    .filter(Boolean);

/** The secret of a new token. No other page shows it. */
function Secret({ secret, onClose }: { secret: string; onClose: () => void }) {
  return (
    <Modal isOpen variant="medium" aria-labelledby="token-secret">
      <ModalHeader title={i18n._('The new token')} labelId="token-secret" />
      <ModalBody>
        <Alert variant="warning" isInline component="h2" title={i18n._('Copy the token now')}>
          {i18n._('It is shown only once. The box stores a digest of it, and cannot show it again.')}
        </Alert>
        <ClipboardCopy
          isReadOnly
          isCode
          hoverTip={i18n._('Copy')}
          clickTip={i18n._('Copied')}
          textAriaLabel={i18n._('Token')}
        >
          {secret}
        </ClipboardCopy>
      </ModalBody>
      <ModalFooter>
        <Button onClick={onClose}>{i18n._('I have copied it')}</Button>
      </ModalFooter>
    </Modal>
  );
}

/** Asks for the properties of a new token, and shows its secret once. */
export function CreateToken({ onClose }: { onClose: () => void }) {
  const [name, setName] = useState('');
  const [role, setRole] = useState<Role>('reader');
  const [apis, setApis] = useState('');
  const [shares, setShares] = useState('');
  const [lifetime, setLifetime] = useState(365 * DAY);
  const [secret, setSecret] = useState<string | null>(null);
  const create = useChange<'VORN.Server.Token/v1/create'>(i18n._('The token was created'), ({ data }) => {
    setSecret(data.token);
  });
  if (secret) return <Secret secret={secret} onClose={onClose} />;
  return (
    <FormDialog
      id="create-token"
      title={i18n._('Create a token')}
      submit={i18n._('Create')}
      isValid={!!name}
      isPending={create.isPending}
      onSubmit={() => {
        create.mutate({
          method: 'VORN.Server.Token/v1/create',
          parameters: {
            name,
            role,
            ...(apis.trim() && { apis: namesIn(apis) }),
            ...(shares.trim() && { shares: namesIn(shares) }),
            ...(lifetime > 0 && { expires_in: lifetime }),
          },
          tag: null,
        });
      }}
      onClose={onClose}
    >
      {create.error && <Problem error={create.error} />}
      <TextField
        label={i18n._('Name')}
        help={i18n._('The program or the machine that will use the token.')}
        value={name}
        isRequired
        onChange={setName}
      />
      <ChoiceField
        label={i18n._('Role')}
        help={i18n._('A reader can look at everything and change nothing.')}
        value={role}
        choices={(Object.keys(ROLES) as Role[]).map((value) => ({ value, text: i18n._(ROLES[value]) }))}
        onChange={setRole}
      />
      <TextField
        label={i18n._('Only these APIs (optional)')}
        help={i18n._('Names of APIs, with commas between them, as {example}.', {
          example: 'VORN.Core.FileServ.NFS.IDMap',
        })}
        value={apis}
        onChange={setApis}
      />
      <TextField
        label={i18n._('Only these shared folders (optional)')}
        help={i18n._(
          'Names of shared folders, with commas between them. The token can then only call methods of one folder.',
        )}
        value={shares}
        onChange={setShares}
      />
      <ChoiceField
        label={i18n._('Expires after')}
        value={lifetime}
        choices={LIFETIMES.map(({ value, text }) => ({ value, text: i18n._(text) }))}
        onChange={setLifetime}
      />
    </FormDialog>
  );
}
