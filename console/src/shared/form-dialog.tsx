import type { ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { Button, Form, Modal, ModalBody, ModalFooter, ModalHeader } from '@patternfly/react-core';

interface Props {
  /** Of the elements; it occurs once in the page. */
  id: string;
  title: string;
  /** The text of the button that submits. */
  submit: string;
  isValid: boolean;
  isPending?: boolean;
  isWide?: boolean;
  onSubmit: () => void;
  onClose: () => void;
  children: ReactNode;
}

/** A form in a dialog, with a button that submits and one that cancels. */
export function FormDialog({ id, title, submit, isValid, isPending, isWide, onSubmit, onClose, children }: Props) {
  return (
    <Modal isOpen variant={isWide ? 'medium' : 'small'} onClose={onClose} aria-labelledby={id}>
      <ModalHeader title={title} labelId={id} />
      <ModalBody {...(isWide && { tabIndex: 0 })}>
        <Form
          id={`${id}-form`}
          onSubmit={(event) => {
            event.preventDefault();
            if (isValid) onSubmit();
          }}
        >
          {children}
        </Form>
      </ModalBody>
      <ModalFooter>
        <Button
          type="submit"
          form={`${id}-form`}
          isLoading={isPending ?? false}
          isDisabled={!isValid || (isPending ?? false)}
        >
          {submit}
        </Button>
        <Button variant="link" onClick={onClose}>
          {i18n._('Cancel')}
        </Button>
      </ModalFooter>
    </Modal>
  );
}
