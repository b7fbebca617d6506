import { useState, type ReactNode } from 'react';
import { useMutation, useQueryClient } from '@tanstack/react-query';
import { i18n } from '@lingui/core';
import {
  ActionGroup,
  Button,
  Card,
  CardBody,
  CardTitle,
  Content,
  Form,
  FormGroup,
  Modal,
  ModalBody,
  ModalHeader,
  TextInput,
} from '@patternfly/react-core';
import { Problem } from '../shared/problem';
import { readAgain } from '../shared/read-again';
import { signIn } from './session';

/** The form that asks for an account and its password. */
function SignInForm() {
  const client = useQueryClient();
  const [account, setAccount] = useState('');
  const [password, setPassword] = useState('');
  const attempt = useMutation({
    mutationKey: ['sign-in'],
    mutationFn: () => signIn({ account, password }),
    onSuccess: () => readAgain(client),
    onSettled: () => {
      setPassword('');
    },
  });
  return (
    <Form
      onSubmit={(event) => {
        event.preventDefault();
        attempt.mutate();
      }}
    >
      {attempt.error && <Problem error={attempt.error} title={i18n._('Signing in failed')} />}
      <FormGroup label={i18n._('Account')} fieldId="account" isRequired>
        <TextInput
          id="account"
          value={account}
          onChange={(_event, text) => {
            setAccount(text);
          }}
          autoComplete="username"
          isRequired
        />
      </FormGroup>
      <FormGroup label={i18n._('Password')} fieldId="password" isRequired>
        <TextInput
          id="password"
          type="password"
          value={password}
          onChange={(_event, text) => {
            setPassword(text);
          }}
          autoComplete="current-password"
          isRequired
        />
      </FormGroup>
      <ActionGroup>
        <Button type="submit" isLoading={attempt.isPending} isDisabled={!account || !password || attempt.isPending}>
          {i18n._('Sign in')}
        </Button>
      </ActionGroup>
    </Form>
  );
}

/** The whole page while nobody has signed in. */
export function SignInPage({ notice }: { notice?: ReactNode }) {
  return (
    <main className="sign-in">
      <Card>
        <CardTitle component="h1">{i18n._('Sign in to the storage console')}</CardTitle>
        <CardBody>
          {notice}
          <Content component="p">
            {i18n._('Use an account of the box whose group may administer it, or may look at its settings.')}
          </Content>
          <SignInForm />
        </CardBody>
      </Card>
    </main>
  );
}

/** Asks again when the session has ended. The page below keeps what was typed. */
export function SignInAgain() {
  return (
    <Modal isOpen variant="small" aria-labelledby="sign-in-again">
      <ModalHeader title={i18n._('Your session has ended')} labelId="sign-in-again" />
      <ModalBody>
        <Content component="p">{i18n._('Sign in again. What you have typed is still there.')}</Content>
        <SignInForm />
      </ModalBody>
    </Modal>
  );
}
