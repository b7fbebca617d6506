import { useCallback } from 'react';
import { keepPreviousData, useQueries, useQuery } from '@tanstack/react-query';
import { call, type Answer, type Data } from '../../api/call';

export type Mapping = Data<'VORN.Core.FileServ.NFS.IDMap/v1/list'>['idmap'][number];

const LIST = 'VORN.Core.FileServ.NFS.IDMap/v1/list';
const PAGE = 200; // mappings of one request

const pageQuery = (filter: string, page: number) => ({
  queryKey: [LIST, filter, page] as const,
  staleTime: 30_000,
  queryFn: ({ signal }: { signal: AbortSignal }) =>
    call(LIST, { offset: page * PAGE, limit: PAGE, filter }, { signal }),
});

const listsOf = (results: { data: Answer<Data<typeof LIST>> | undefined }[]) =>
  results.map(({ data }) => data?.data.idmap);

/** The first and the last of some pages, from 0. */
export interface Pages {
  first: number;
  last: number;
}

/** The pages with the rows from `first` to `last`. */
export const pagesOf = (first: number, last: number): Pages => ({
  first: Math.floor(first / PAGE),
  last: Math.floor(last / PAGE),
});

/** The number of mappings that match, and the mappings of these pages. */
export function useMappings(filter: string, { first, last }: Pages) {
  const head = useQuery({ ...pageQuery(filter, 0), placeholderData: keepPreviousData });
  const queries = Array.from({ length: last - first + 1 }, (_, index) => pageQuery(filter, first + index));
  const lists = useQueries({ queries, combine: listsOf });
  const row = useCallback(
    (index: number): Mapping | undefined => lists[Math.floor(index / PAGE) - first]?.[index % PAGE],
    [lists, first],
  );
  return { head, total: head.data?.data.total ?? 0, row };
}
