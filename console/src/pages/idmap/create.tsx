import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Alert, Button, FormGroup } from '@patternfly/react-core';
import { ChangeDialog } from '../../shared/change-dialog';
import { FileField } from '../../shared/file-field';
import { FormDialog } from '../../shared/form-dialog';
import { Loaded } from '../../shared/page';
import { useRead } from '../../shared/use-read';
import { parseLines } from './lines';

const SHOWN = 20; // suggestions

/** Local users with the principals that they probably have; one click adds a line. */
function Suggestions({ onChoose }: { onChoose: (line: string) => void }) {
  const suggestions = useRead('VORN.Core.FileServ.NFS.IDMap/v1/list', { suggestion: true, limit: SHOWN });
  return (
    <FormGroup role="group" fieldId="suggestions" label={i18n._('Suggestions')}>
      <Loaded query={suggestions}>
        {({ data }) => (
          <div className="suggestions">
            {data.idmap.map(({ kerberos_principal: principal, local_name: user }) => (
              <Button
                key={principal}
                variant="secondary"
                size="sm"
                onClick={() => {
                  onChoose(`${principal}, ${user}`);
                }}
              >
                {principal}
              </Button>
            ))}
          </div>
        )}
      </Loaded>
    </FormGroup>
  );
}

/** Asks for mappings, one a line, and then for a confirmation. */
export function CreateMappings({ onClose }: { onClose: () => void }) {
  const [text, setText] = useState('');
  const [name, setName] = useState('');
  const [reviewed, setReviewed] = useState(false);
  const { mappings, faulty } = parseLines(text);
  if (reviewed) {
    return (
      <ChangeDialog
        title={i18n._('{n, plural, one {What adding # mapping does} other {What adding # mappings does}}', {
          n: mappings.length,
        })}
        confirm={i18n._('Add')}
        done={i18n._('The mappings were added')}
        change={{ method: 'VORN.Core.FileServ.NFS.IDMap/v1/create', parameters: { idmap: mappings }, tag: null }}
        onDone={onClose}
        onClose={() => {
          setReviewed(false);
        }}
      />
    );
  }
  return (
    <FormDialog
      id="create-mappings"
      title={i18n._('Add mappings')}
      submit={i18n._('Review')}
      isValid={mappings.length > 0 && faulty.length === 0}
      isWide
      onSubmit={() => {
        setReviewed(true);
      }}
      onClose={onClose}
    >
      <FormGroup
        label={i18n._('One mapping a line: the principal, a comma, the user of the box')}
        fieldId="mappings"
        isRequired
      >
        <FileField
          id="mappings"
          type="text"
          value={text}
          filename={name}
          allowEditingUploadedText
          filenamePlaceholder={i18n._('Type or paste below, or drag a CSV file here')}
          clearButtonText={i18n._('Clear')}
          filenameAriaLabel={i18n._('CSV file')}
          aria-label={i18n._('Mappings')}
          onChoose={(file) => {
            setName(file.name);
            void file.text().then(setText);
          }}
          onTextChange={(_event, value) => {
            setText(value);
          }}
          onClear={() => {
            setName('');
            setText('');
          }}
        />
      </FormGroup>
      {faulty.length > 0 && (
        <Alert
          variant="danger"
          isInline
          component="h2"
          title={i18n._('These lines are no mappings: {lines}', { lines: faulty.slice(0, 20).join(', ') })}
        />
      )}
      <Suggestions
        onChoose={(line) => {
          setText(text === '' || text.endsWith('\n') ? text + line + '\n' : `${text}\n${line}\n`);
        }}
      />
    </FormDialog>
  );
}
