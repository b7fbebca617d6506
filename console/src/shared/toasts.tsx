import { useSyncExternalStore } from 'react';
import { i18n } from '@lingui/core';
import { Alert, AlertActionCloseButton, AlertGroup } from '@patternfly/react-core';

interface Remarks {
  warnings: string[];
  /** Whether the history can undo what was done. */
  isRecorded: boolean;
}

interface Toast extends Remarks {
  id: number;
  title: string;
}

let toasts: Toast[] = [];
let last = 0;
const listeners = new Set<() => void>();

function change(next: Toast[]) {
  toasts = next;
  for (const listener of listeners) listener();
}

/** Tells that something was done. A message with warnings stays until it is closed. */
export function toast(title: string, remarks: Remarks) {
  last += 1;
  change([...toasts, { id: last, title, ...remarks }]);
}

const close = (id: number) => {
  change(toasts.filter((each) => each.id !== id));
};

function subscribe(listener: () => void) {
  listeners.add(listener);
  return () => listeners.delete(listener);
}

export function Toasts() {
  const shown = useSyncExternalStore(subscribe, () => toasts);
  return (
    <AlertGroup isToast isLiveRegion hasAnimations={false} aria-label={i18n._('Messages')}>
      {shown.map(({ id, title, warnings, isRecorded }) => (
        <Alert
          key={id}
          title={title}
          component="h2"
          variant={warnings.length > 0 ? 'warning' : 'success'}
          timeout={warnings.length > 0 ? false : 6000}
          onTimeout={() => {
            close(id);
          }}
          actionLinks={isRecorded && <a href="#/history">{i18n._('Undo it in the history')}</a>}
          actionClose={
            <AlertActionCloseButton
              title={i18n._('Close')}
              onClose={() => {
                close(id);
              }}
            />
          }
        >
          {warnings.join(' ')}
        </Alert>
      ))}
    </AlertGroup>
  );
}
