import { keepPreviousData, useQuery, type UseQueryResult } from '@tanstack/react-query';
import { call, type Answer, type Data, type Method, type Parameters } from '../api/call';

interface Options {
  /** Shows the previous answer until the one with other parameters is there: for filters and pages of a list. */
  keepsPrevious?: boolean;
}

/** The answer of a reading method. It is read again when the page becomes visible, and after each change. */
export function useRead<M extends Method>(
  method: M,
  parameters: Parameters<M>,
  { keepsPrevious = false }: Options = {},
): UseQueryResult<Answer<Data<M>>> {
  return useQuery({
    queryKey: [method, parameters],
    queryFn: ({ signal }) => call(method, parameters, { signal }),
    ...(keepsPrevious && { placeholderData: keepPreviousData }),
  });
}
