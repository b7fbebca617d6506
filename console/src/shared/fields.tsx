// Fields of forms. All of them are switched off for readers.
import { useId, type ReactNode } from 'react';
import { i18n } from '@lingui/core';
import {
  FormGroup,
  FormHelperText,
  FormSelect,
  FormSelectOption,
  HelperText,
  HelperTextItem,
  Switch,
  TextInput,
} from '@patternfly/react-core';
import { useMayWrite } from '../session/session';

interface FieldProps {
  label: string;
  help?: ReactNode;
  error?: string | undefined;
  isDisabled?: boolean;
}

function Help({ id, help, error }: { id: string; help?: ReactNode; error?: string | undefined }) {
  if (!help && !error) return null;
  return (
    <FormHelperText>
      <HelperText id={id} isLiveRegion={error !== undefined}>
        {error ? (
          <HelperTextItem variant="error" screenReaderText={i18n._('Error')}>
            {error}
          </HelperTextItem>
        ) : (
          <HelperTextItem>{help}</HelperTextItem>
        )}
      </HelperText>
    </FormHelperText>
  );
}

export function SwitchField({
  label,
  help,
  isDisabled,
  value,
  onChange,
}: FieldProps & {
  value: boolean;
  onChange: (value: boolean) => void;
}) {
  const id = useId();
  const mayWrite = useMayWrite();
  return (
    <FormGroup>
      <Switch
        id={id}
        label={label}
        aria-describedby={`${id}-help`}
        isChecked={value}
        isDisabled={isDisabled === true || !mayWrite}
        onChange={(_event, checked) => {
          onChange(checked);
        }}
      />
      <Help id={`${id}-help`} help={help} />
    </FormGroup>
  );
}

interface TextProps extends FieldProps {
  value: string;
  onChange: (value: string) => void;
  isRequired?: boolean;
  type?: 'text' | 'number';
}

/** A text that may be entered by everybody. Settings use TextField. */
export function Text({
  label,
  help,
  error,
  isDisabled = false,
  value,
  onChange,
  isRequired = false,
  type = 'text',
}: TextProps) {
  const id = useId();
  return (
    <FormGroup label={label} fieldId={id} isRequired={isRequired}>
      <TextInput
        id={id}
        type={type}
        value={value}
        isRequired={isRequired}
        autoComplete="off"
        spellCheck={false}
        aria-describedby={`${id}-help`}
        isDisabled={isDisabled}
        validated={error ? 'error' : 'default'}
        onChange={(_event, text) => {
          onChange(text);
        }}
      />
      <Help id={`${id}-help`} help={help} error={error} />
    </FormGroup>
  );
}

export function TextField({ isDisabled = false, ...field }: TextProps) {
  const mayWrite = useMayWrite();
  return <Text {...field} isDisabled={isDisabled || !mayWrite} />;
}

/** A whole number; NaN while the field has none. */
export function NumberField({
  value,
  onChange,
  ...field
}: FieldProps & {
  value: number;
  onChange: (value: number) => void;
}) {
  return (
    <TextField
      {...field}
      type="number"
      value={Number.isNaN(value) ? '' : String(value)}
      onChange={(text) => {
        onChange(/^-?\d+$/.test(text) ? Number(text) : NaN);
      }}
    />
  );
}

export interface Choice<T extends string | number> {
  value: T;
  text: string;
}

interface ChoiceProps<T extends string | number> extends FieldProps {
  value: T;
  choices: Choice<T>[];
  onChange: (value: T) => void;
}

/** A choice for everybody. Settings use ChoiceField. */
export function Choices<T extends string | number>({
  label,
  help,
  isDisabled = false,
  value,
  choices,
  onChange,
}: ChoiceProps<T>) {
  const id = useId();
  return (
    <FormGroup label={label} fieldId={id}>
      <FormSelect
        id={id}
        value={value}
        aria-describedby={`${id}-help`}
        isDisabled={isDisabled}
        onChange={(_event, text) => {
          const chosen = choices.find((choice) => String(choice.value) === text);
          if (chosen) onChange(chosen.value);
        }}
      >
        {choices.map((choice) => (
          <FormSelectOption key={choice.value} value={choice.value} label={choice.text} />
        ))}
      </FormSelect>
      <Help id={`${id}-help`} help={help} />
    </FormGroup>
  );
}

export function ChoiceField<T extends string | number>({ isDisabled = false, ...field }: ChoiceProps<T>) {
  const mayWrite = useMayWrite();
  return <Choices {...field} isDisabled={isDisabled || !mayWrite} />;
}
