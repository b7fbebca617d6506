import { useQuery, type UseQueryResult } from '@tanstack/react-query';
import { call, type Answer, type Data, type Method, type Parameters } from '../api/call';

/** The answer of a reading method. It is read again when the page becomes visible, and after each change. */
export function useRead<M extends Method>(
  method: M,
  parameters: Parameters<M>,
  enabled = true,
): UseQueryResult<Answer<Data<M>>> {
  return useQuery({
    queryKey: [method, parameters],
    queryFn: ({ signal }) => call(method, parameters, { signal }),
    enabled,
  });
}
