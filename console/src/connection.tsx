import { useEffect, useState } from 'react';
import { useQueryClient } from '@tanstack/react-query';
import { i18n } from '@lingui/core';
import { Alert } from '@patternfly/react-core';
import { Unreachable } from './api/call';
import { readAgain } from './shared/read-again';

const PAUSE = 2000; // milliseconds between two attempts to reach the box

async function isReachable(): Promise<boolean> {
  try {
    return (await fetch('/healthz', { cache: 'no-store' })).ok;
  } catch {
    return false;
  }
}

/** Whether the last call got no answer. */
function useLoss(): [boolean, () => void] {
  const client = useQueryClient();
  const [lost, setLost] = useState(false);
  useEffect(() => {
    const notice = (error: unknown) => {
      if (error instanceof Unreachable) setLost(true);
    };
    const stopQueries = client.getQueryCache().subscribe((event) => {
      if (event.type === 'updated' && event.action.type === 'error') notice(event.action.error);
    });
    const stopMutations = client.getMutationCache().subscribe((event) => {
      if (event.type === 'updated' && event.action.type === 'error') notice(event.action.error);
    });
    return () => {
      stopQueries();
      stopMutations();
    };
  }, [client]);
  return [
    lost,
    () => {
      setLost(false);
    },
  ];
}

/** Tells that the box cannot be reached, tries again, and has everything read again when it answers. */
export function Connection() {
  const client = useQueryClient();
  const [lost, found] = useLoss();
  useEffect(() => {
    if (!lost) return;
    const timer = setInterval(() => {
      void isReachable().then((reachable) => {
        if (!reachable) return;
        found();
        void readAgain(client);
      });
    }, PAUSE);
    return () => {
      clearInterval(timer);
    };
  }, [lost, found, client]);
  if (!lost) return null;
  return (
    <Alert variant="warning" isInline component="h2" role="alert" title={i18n._('The box does not answer')}>
      {i18n._('The console tries again every two seconds. What you have typed is still there.')}
    </Alert>
  );
}
