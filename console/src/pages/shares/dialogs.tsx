import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Content } from '@patternfly/react-core';
import type { Answer, Data } from '../../api/call';
import { ChangeDialog } from '../../shared/change-dialog';
import type { Fact } from '../../shared/conflict';
import { TextField } from '../../shared/fields';
import { FormDialog } from '../../shared/form-dialog';
import { go, linkTo } from '../../shared/router';
import { ruleCount } from './rule';

type Shares = Data<'VORN.Core.Share/v1/list'>;

const describe = ({ shares }: Shares): Fact[] =>
  shares.map(({ name, path, rules }) => ({ label: name, text: `${path}, ${ruleCount(rules)}` }));

/** The decision between a change of the list that was seen and the changes of others. */
const decisionOf = (mine: Fact[], onTakeTheirs: () => void) => ({
  kind: 'joins' as const,
  mine,
  describe: (stored: unknown) => describe(stored as Shares),
  onTakeTheirs,
});

/** Asks for the name and the path of a new shared folder, and then for a confirmation. */
export function CreateShare({ shown, onClose }: { shown: Answer<Shares>; onClose: () => void }) {
  const [seen] = useState(shown); // another answer may come while the dialog is open
  const [name, setName] = useState('');
  const [path, setPath] = useState('');
  const [reviewed, setReviewed] = useState(false);
  if (reviewed) {
    return (
      <ChangeDialog
        title={i18n._('What sharing the folder does')}
        confirm={i18n._('Share the folder')}
        done={i18n._('The folder is shared. Now add rules for its clients.')}
        change={{ method: 'VORN.Core.Share/v1/create', parameters: { name, path }, tag: seen.tag }}
        decision={decisionOf([...describe(seen.data), { label: name, text: path }], onClose)}
        onDone={() => {
          onClose();
          go(linkTo('shares', name).slice(1));
        }}
        onClose={() => {
          setReviewed(false);
        }}
      />
    );
  }
  return (
    <FormDialog
      id="create-share"
      title={i18n._('Share a folder')}
      submit={i18n._('Review')}
      isValid={!!name && path.startsWith('/')}
      onSubmit={() => {
        setReviewed(true);
      }}
      onClose={onClose}
    >
      <TextField
        label={i18n._('Name')}
        help={i18n._('How the folder is called here. Clients mount it by its path.')}
        value={name}
        isRequired
        onChange={setName}
      />
      <TextField
        label={i18n._('Folder on the box')}
        help={i18n._('The whole path of a folder that exists, for example /volume1/photos.')}
        value={path}
        isRequired
        error={path && !path.startsWith('/') ? i18n._('A path begins with /.') : undefined}
        onChange={setPath}
      />
    </FormDialog>
  );
}

export function DeleteShare({ name, shown, onClose }: { name: string; shown: Answer<Shares>; onClose: () => void }) {
  const [seen] = useState(shown);
  const mine = describe(seen.data).filter(({ label }) => label !== name);
  return (
    <ChangeDialog
      title={i18n._('Stop sharing {name}?', { name })}
      confirm={i18n._('Stop sharing')}
      done={i18n._('The folder is no longer shared')}
      isDanger
      change={{ method: 'VORN.Core.Share/v1/delete', parameters: { name }, tag: seen.tag }}
      decision={decisionOf(mine, onClose)}
      onDone={onClose}
      onClose={onClose}
    >
      <Content component="p">{i18n._('The folder and its files stay on the box.')}</Content>
    </ChangeDialog>
  );
}
