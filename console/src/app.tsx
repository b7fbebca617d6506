import { useLingui } from '@lingui/react';
import { Bullseye, PageSection, Spinner } from '@patternfly/react-core';
import { Connection } from './connection';
import { Pages } from './pages';
import { SessionProvider, useCaller, useSessionEnd } from './session/session';
import { SignInAgain, SignInPage } from './session/sign-in';
import { Problem } from './shared/problem';
import { Toasts } from './shared/toasts';
import { Shell } from './shell';

/** The sign-in form, or the shell with its pages. */
export function App() {
  const { i18n } = useLingui(); // another language renders everything anew
  const caller = useCaller();
  const ended = useSessionEnd();
  if (caller.data) {
    return (
      <SessionProvider caller={caller.data}>
        <Shell>
          <Connection />
          <Pages />
        </Shell>
        {ended && <SignInAgain />}
        <Toasts />
      </SessionProvider>
    );
  }
  if (caller.isPending) {
    return (
      <Bullseye>
        <Spinner aria-label={i18n._('Loading')} />
      </Bullseye>
    );
  }
  return (
    <>
      <PageSection>
        <Connection />
      </PageSection>
      <SignInPage notice={caller.error && <Problem error={caller.error} title={i18n._('Signing in failed')} />} />
    </>
  );
}
