// The address of a page is the part behind "#", so that the server needs no fall-back. A page with unsaved changes can
// stop the move to another one.
import { useEffect, useSyncExternalStore } from 'react';

const current = () => (location.hash.startsWith('#/') ? location.hash.slice(1) : '/');

let shown = current();
let guard: ((target: string) => void) | null = null;
const listeners = new Set<() => void>();

function show(path: string) {
  shown = path;
  for (const listener of listeners) listener();
}

function follow() {
  const target = current();
  if (target === shown) return;
  if (!guard) {
    show(target);
    return;
  }
  history.replaceState(null, '', `#${shown}`);
  guard(target);
}

window.addEventListener('hashchange', follow);

function subscribe(listener: () => void) {
  listeners.add(listener);
  return () => listeners.delete(listener);
}

/** The path of the page that is shown: "/shares/data". */
export const usePath = () => useSyncExternalStore(subscribe, () => shown);

/** Goes to a page, past any guard. */
export function go(path: string) {
  history.pushState(null, '', `#${path}`);
  show(path);
}

/** The address of a page, for links. */
export const linkTo = (...parts: string[]) => `#/${parts.map(encodeURIComponent).join('/')}`;

/** The parts of a path, as linkTo() got them. */
export const partsOf = (path: string) => (path.split('?')[0] ?? '').split('/').filter(Boolean).map(decodeURIComponent);

/** What a link hands to a page behind the "?" of a path. */
export const queryOf = (path: string) => new URLSearchParams(path.split('?')[1]);

/** While `active`, calls `onLeave` with the path of a link instead of following it, and has the browser ask. */
export function useGuard(active: boolean, onLeave: (target: string) => void) {
  useEffect(() => {
    if (!active) return;
    const ask = (event: BeforeUnloadEvent) => {
      event.preventDefault();
    };
    guard = onLeave;
    window.addEventListener('beforeunload', ask);
    return () => {
      guard = null;
      window.removeEventListener('beforeunload', ask);
    };
  }, [active, onLeave]);
}
