import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Alert, Button, FormGroup, List, ListItem } from '@patternfly/react-core';
import { ChangeDialog } from '../../shared/change-dialog';
import { FileField } from '../../shared/file-field';
import { FormDialog } from '../../shared/form-dialog';
import { Loaded } from '../../shared/page';
import { usePreview } from '../../shared/preview';
import { conflictsOf, Problem } from '../../shared/problem';
import { useRead } from '../../shared/use-read';
import { parseLines, type Lines } from './lines';

const CREATE = 'VORN.Core.FileServ.NFS.IDMap/v1/create';
const SHOWN = 20; // suggestions, and conflicts

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

/** The lines whose principals are mapped already, or why the mappings cannot be added. */
function Conflicts({ lines: { mappings, numbers }, error }: { lines: Lines; error: unknown }) {
  if (!error) return null;
  const mapped = new Set(conflictsOf(error));
  const conflicts = mappings.flatMap(({ kerberos_principal: principal }, index) =>
    mapped.has(principal) ? [{ principal, line: numbers[index] ?? 0 }] : [],
  );
  if (conflicts.length === 0) return <Problem error={error} />;
  return (
    <Alert variant="danger" isInline component="h2" title={i18n._('Some principals are mapped already')}>
      <List>
        {conflicts.slice(0, SHOWN).map(({ principal, line }) => (
          <ListItem key={line}>{i18n._('Line {line}: {principal}', { line, principal })}</ListItem>
        ))}
      </List>
    </Alert>
  );
}

/** Asks for mappings, one a line, and then for a confirmation. */
export function CreateMappings({ onClose }: { onClose: () => void }) {
  const [text, setText] = useState('');
  const [name, setName] = useState('');
  const [reviewed, setReviewed] = useState(false);
  const lines = parseLines(text);
  const { mappings, faulty } = lines;
  const isValid = mappings.length > 0 && faulty.length === 0;
  const change = { method: CREATE, parameters: { idmap: mappings }, tag: null } as const;
  const preview = usePreview(isValid && !reviewed ? change : null);
  if (reviewed) {
    return (
      <ChangeDialog
        title={i18n._('{n, plural, one {What adding # mapping does} other {What adding # mappings does}}', {
          n: mappings.length,
        })}
        confirm={i18n._('Add')}
        done={i18n._('The mappings were added')}
        change={change}
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
      isValid={isValid}
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
      {isValid && <Conflicts lines={lines} error={preview.error} />}
      <Suggestions
        onChoose={(line) => {
          setText(text === '' || text.endsWith('\n') ? text + line + '\n' : `${text}\n${line}\n`);
        }}
      />
    </FormDialog>
  );
}
