import { useEffect, useState } from 'react';
import { keepPreviousData, useIsMutating, useQuery } from '@tanstack/react-query';
import { call, type Method } from '../api/call';
import type { Change } from './change-dialog';
import { PREVIEWS } from './read-again';

const PAUSE = 400; // milliseconds without an edit, after which the server is asked

/** The value, when it has not changed for a moment. */
function useSettled<T>(value: T): T {
  const [settled, setSettled] = useState(value);
  const text = JSON.stringify(value);
  useEffect(() => {
    const timer = setTimeout(() => {
      setSettled(JSON.parse(text) as T);
    }, PAUSE);
    return () => {
      clearTimeout(timer);
    };
  }, [text]);
  return settled;
}

/**
 * What a change would do, while it is being edited; null asks for nothing. While a change is being made, nothing is asked
 * either: the tag of what is edited is outdated as soon as that has succeeded.
 */
export function usePreview<M extends Method>(change: Change<M> | null) {
  const settled = useSettled(change);
  const isChanging = useIsMutating() > 0;
  return useQuery({
    queryKey: [...PREVIEWS, settled],
    queryFn: ({ signal }) => {
      if (!settled) throw new Error('nothing to rehearse');
      return call(settled.method, settled.parameters, { ifMatch: settled.tag, rehearse: true, signal });
    },
    enabled: settled !== null && change !== null && !isChanging,
    placeholderData: keepPreviousData,
    staleTime: Infinity,
    gcTime: 0,
  });
}
