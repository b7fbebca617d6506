import { useState } from 'react';
import { i18n } from '@lingui/core';
import { ChangeDialog } from '../../shared/change-dialog';
import { TextField } from '../../shared/fields';
import { FormDialog } from '../../shared/form-dialog';
import type { Mapping } from './data';

export function DeleteMapping({ mapping, onClose }: { mapping: Mapping; onClose: () => void }) {
  return (
    <ChangeDialog
      title={i18n._('What deleting the mapping of {id} does', { id: mapping.id })}
      confirm={i18n._('Delete')}
      done={i18n._('The mapping was deleted')}
      isDanger
      change={{ method: 'VORN.Core.FileServ.NFS.IDMap/v1/delete', parameters: { id: mapping.id }, tag: null }}
      onDone={onClose}
      onClose={onClose}
    />
  );
}

export function ChangeMapping({ mapping, onClose }: { mapping: Mapping; onClose: () => void }) {
  const [principal, setPrincipal] = useState(mapping.kerberos_principal);
  const [user, setUser] = useState(mapping.local_name);
  const [reviewed, setReviewed] = useState(false);
  if (reviewed) {
    return (
      <ChangeDialog
        title={i18n._('What saving does')}
        confirm={i18n._('Save')}
        done={i18n._('Saved')}
        change={{
          method: 'VORN.Core.FileServ.NFS.IDMap/v1/set',
          parameters: { id: mapping.id, kerberos_principal: principal, local_name: user },
          tag: null,
        }}
        onDone={onClose}
        onClose={() => {
          setReviewed(false);
        }}
      />
    );
  }
  const isChanged = principal !== mapping.kerberos_principal || user !== mapping.local_name;
  return (
    <FormDialog
      id="change-mapping"
      title={i18n._('Change the mapping')}
      submit={i18n._('Review and save')}
      isValid={!!principal && !!user && isChanged}
      onSubmit={() => {
        setReviewed(true);
      }}
      onClose={onClose}
    >
      <TextField label={i18n._('Principal')} value={principal} isRequired onChange={setPrincipal} />
      <TextField label={i18n._('User of the box')} value={user} isRequired onChange={setUser} />
    </FormDialog>
  );
}
