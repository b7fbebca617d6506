import { useState } from 'react';

const same = (a: unknown, b: unknown) => JSON.stringify(a) === JSON.stringify(b);

export interface Draft<T> {
  value: T;
  /** The entity tag of the data that the edits began with. */
  tag: string | null;
  dirty: boolean;
  set: (value: T) => void;
  change: (part: Partial<T>) => void;
  /** Forgets the edits, and shows the newest data. */
  reset: () => void;
}

/**
 * Data that is edited before it is saved. Newer data replaces a draft without edits. A draft with edits keeps the entity
 * tag that it began with, so that saving it detects the changes of others.
 */
export function useDraft<T>(stored: T, tag: string | null): Draft<T> {
  const [base, setBase] = useState({ stored, tag });
  const [edited, setEdited] = useState<T | null>(null);
  const dirty = edited !== null && !same(edited, base.stored);
  if (!dirty && !same(base, { stored, tag })) setBase({ stored, tag });
  const value = dirty ? edited : base.stored;
  return {
    value,
    tag: base.tag,
    dirty,
    set: setEdited,
    change: (part) => {
      setEdited({ ...value, ...part });
    },
    reset: () => {
      setEdited(null);
    },
  };
}
