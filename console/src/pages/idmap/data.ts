import { keepPreviousData, useQueries, useQuery } from '@tanstack/react-query';
import { call, type Data } from '../../api/call';

export type Mapping = Data<'VORN.Core.FileServ.NFS.IDMap/v1/list'>['idmap'][number];

const LIST = 'VORN.Core.FileServ.NFS.IDMap/v1/list';
const PAGE = 200; // mappings of one request

const pageQuery = (filter: string, page: number) => ({
  queryKey: [LIST, filter, page] as const,
  staleTime: 30_000,
  queryFn: ({ signal }: { signal: AbortSignal }) =>
    call(LIST, { offset: page * PAGE, limit: PAGE, filter }, { signal }),
});

/** The number of mappings that match, and those in the rows from `first` to `last`, which are read page by page. */
export function useMappings(filter: string, first: number, last: number) {
  const head = useQuery({ ...pageQuery(filter, 0), placeholderData: keepPreviousData });
  const from = Math.floor(first / PAGE);
  const pages = Array.from({ length: Math.floor(last / PAGE) - from + 1 }, (_, index) => from + index);
  const results = useQueries({ queries: pages.map((page) => pageQuery(filter, page)) });
  return {
    head,
    total: head.data?.data.total ?? 0,
    row: (index: number): Mapping | undefined =>
      results[Math.floor(index / PAGE) - from]?.data?.data.idmap[index % PAGE],
  };
}
