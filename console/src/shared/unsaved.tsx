import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Modal, ModalBody, ModalFooter, ModalHeader } from '@patternfly/react-core';
import { go, useGuard } from './router';

/** Asks before a page with unsaved changes is left. */
export function UnsavedGuard({ dirty }: { dirty: boolean }) {
  const [target, setTarget] = useState<string | null>(null);
  useGuard(dirty, setTarget);
  if (target === null) return null;
  const stay = () => {
    setTarget(null);
  };
  return (
    <Modal isOpen variant="small" onClose={stay} aria-labelledby="unsaved" aria-describedby="unsaved-text">
      <ModalHeader title={i18n._('Leave without saving?')} labelId="unsaved" />
      <ModalBody id="unsaved-text">{i18n._('Your changes on this page have not been saved.')}</ModalBody>
      <ModalFooter>
        <Button onClick={stay}>{i18n._('Stay')}</Button>
        <Button
          variant="danger"
          onClick={() => {
            setTarget(null);
            go(target);
          }}
        >
          {i18n._('Discard the changes')}
        </Button>
      </ModalFooter>
    </Modal>
  );
}
