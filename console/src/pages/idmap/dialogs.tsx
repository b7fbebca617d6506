import { useState, type ReactNode } from 'react';
import { useQuery } from '@tanstack/react-query';
import { i18n } from '@lingui/core';
import { Modal, ModalBody, ModalHeader } from '@patternfly/react-core';
import { call, type Answer, type Data } from '../../api/call';
import { ChangeDialog } from '../../shared/change-dialog';
import type { Fact } from '../../shared/conflict';
import { TextField } from '../../shared/fields';
import { FormDialog } from '../../shared/form-dialog';
import { Loaded } from '../../shared/page';
import { REHEARSAL } from '../../shared/read-again';
import type { Mapping } from './data';

const LIST = 'VORN.Core.FileServ.NFS.IDMap/v1/list';

type Listing = Data<typeof LIST>;

const describe = (mapping: Pick<Mapping, 'kerberos_principal' | 'local_name'> | undefined): Fact[] => [
  { label: i18n._('Principal'), text: mapping?.kerberos_principal ?? i18n._('not mapped') },
  { label: i18n._('User of the box'), text: mapping?.local_name ?? i18n._('none') },
];

/** The mapping of a principal in an answer that may have similar principals, too. */
const mappingIn = (listing: unknown, id: string) => (listing as Listing).idmap.find((each) => each.id === id);

/**
 * Reads one mapping anew before a dialog about it opens. The page of the list has many mappings, and a change of any of
 * them would be taken for a change of this one.
 */
function Fresh({
  id,
  onClose,
  children,
}: {
  id: string;
  onClose: () => void;
  children: (answer: Answer<Listing>) => ReactNode;
}) {
  const [attempt] = useState(() => crypto.randomUUID());
  const answer = useQuery({
    queryKey: [REHEARSAL, LIST, id, attempt], // as an answer of one moment
    queryFn: ({ signal }) => call(LIST, { filter: id }, { signal }),
    staleTime: Infinity,
    gcTime: 0,
  });
  if (answer.data) return children(answer.data);
  return (
    <Modal isOpen variant="small" onClose={onClose} aria-labelledby="fresh-mapping">
      <ModalHeader title={id} labelId="fresh-mapping" />
      <ModalBody>
        <Loaded query={answer}>{() => null}</Loaded>
      </ModalBody>
    </Modal>
  );
}

function Deletion({ id, tag, onClose }: { id: string; tag: string | null; onClose: () => void }) {
  return (
    <ChangeDialog
      title={i18n._('What deleting the mapping of {id} does', { id })}
      confirm={i18n._('Delete')}
      done={i18n._('The mapping was deleted')}
      isDanger
      change={{ method: 'VORN.Core.FileServ.NFS.IDMap/v1/delete', parameters: { id }, tag }}
      decision={{
        mine: describe(undefined),
        describe: (stored) => describe(mappingIn(stored, id)),
        onTakeTheirs: onClose,
      }}
      onDone={onClose}
      onClose={onClose}
    />
  );
}

export function DeleteMapping({ mapping: { id }, onClose }: { mapping: Mapping; onClose: () => void }) {
  return (
    <Fresh id={id} onClose={onClose}>
      {({ tag }) => <Deletion id={id} tag={tag} onClose={onClose} />}
    </Fresh>
  );
}

function ChangeForm({ mapping, tag, onClose }: { mapping: Mapping; tag: string | null; onClose: () => void }) {
  const [principal, setPrincipal] = useState(mapping.kerberos_principal);
  const [user, setUser] = useState(mapping.local_name);
  const [reviewed, setReviewed] = useState(false);
  const { id } = mapping;
  if (reviewed) {
    const wanted = { kerberos_principal: principal, local_name: user };
    return (
      <ChangeDialog
        title={i18n._('What saving does')}
        confirm={i18n._('Save')}
        done={i18n._('Saved')}
        change={{
          method: 'VORN.Core.FileServ.NFS.IDMap/v1/set',
          parameters: { id, ...wanted },
          tag,
        }}
        decision={{
          mine: describe(wanted),
          describe: (stored) => describe(mappingIn(stored, id)),
          onTakeTheirs: onClose,
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

export function ChangeMapping({ mapping, onClose }: { mapping: Mapping; onClose: () => void }) {
  return (
    <Fresh id={mapping.id} onClose={onClose}>
      {({ data, tag }) => <ChangeForm mapping={mappingIn(data, mapping.id) ?? mapping} tag={tag} onClose={onClose} />}
    </Fresh>
  );
}
