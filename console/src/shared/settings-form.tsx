import { useState, type ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { ActionGroup, Button, Form } from '@patternfly/react-core';
import type { Method, Parameters } from '../api/call';
import { useMayWrite } from '../session/session';
import { ChangeDialog } from './change-dialog';
import type { Fact } from './conflict';
import { ReadOnlyNotice } from './page';
import { UnsavedGuard } from './unsaved';
import type { Draft } from './use-draft';

/** A form over stored settings: they are edited, reviewed and saved as a whole. */
export function SettingsForm<T, M extends Method>({
  draft,
  method,
  parameters,
  mine,
  describe,
  isValid,
  isWide = false,
  children,
}: {
  draft: Draft<T>;
  method: M;
  parameters: Parameters<M>;
  /** The values of the draft, in words. */
  mine: Fact[];
  /** The values of data that the server has stored, in words. */
  describe: (stored: unknown) => Fact[];
  isValid: boolean;
  /** Whether the form has tables, which need the whole width. */
  isWide?: boolean;
  children: ReactNode;
}) {
  const [reviewed, setReviewed] = useState(false);
  const mayWrite = useMayWrite();
  const close = () => {
    setReviewed(false);
  };
  return (
    <Form
      isWidthLimited={!isWide}
      onSubmit={(event) => {
        event.preventDefault();
        if (draft.dirty && isValid) setReviewed(true);
      }}
    >
      <ReadOnlyNotice />
      {children}
      {mayWrite && (
        <ActionGroup className="save-bar">
          <Button type="submit" isDisabled={!draft.dirty || !isValid}>
            {i18n._('Review and save')}
          </Button>
          <Button variant="secondary" isDisabled={!draft.dirty} onClick={draft.reset}>
            {i18n._('Discard')}
          </Button>
        </ActionGroup>
      )}
      <UnsavedGuard dirty={draft.dirty} />
      {reviewed && (
        <ChangeDialog
          title={i18n._('What saving does')}
          confirm={i18n._('Save')}
          done={i18n._('Saved')}
          change={{ method, parameters, tag: draft.tag }}
          decision={{
            mine,
            describe,
            onTakeTheirs: () => {
              close();
              draft.reset();
            },
          }}
          onDone={() => {
            close();
            draft.reset();
          }}
          onClose={close}
        />
      )}
    </Form>
  );
}
