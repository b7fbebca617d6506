// Lists of all pages share the field that filters and the control that turns pages.
import { useDeferredValue, useState, type ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { Pagination, SearchInput, Toolbar, ToolbarContent, ToolbarItem } from '@patternfly/react-core';
import type { Parameters } from '../api/call';
import { useRead } from './use-read';

export interface Filter {
  /** What is typed. */
  text: string;
  /** The text, as soon as the page has time to filter by it. */
  value: string;
  set: (text: string) => void;
}

export function useFilter(): Filter {
  const [text, set] = useState('');
  return { text, value: useDeferredValue(text), set };
}

/** The field that filters a list, with the number of its results, and buttons beside it. */
export function ListToolbar({
  label,
  filter,
  count,
  children,
}: {
  label: string;
  filter: Filter;
  count?: number | undefined;
  children?: ReactNode;
}) {
  return (
    <Toolbar>
      <ToolbarContent>
        <ToolbarItem>
          <SearchInput
            aria-label={label}
            placeholder={label}
            value={filter.text}
            {...(filter.text && count !== undefined && { resultsCount: count })}
            onChange={(_event, text) => {
              filter.set(text);
            }}
            onClear={() => {
              filter.set('');
            }}
          />
        </ToolbarItem>
        {children && <ToolbarItem>{children}</ToolbarItem>}
      </ToolbarContent>
    </Toolbar>
  );
}

const PAGE_SIZE = 20; // rows

/** The methods that list something page by page, and tell how much there is. */
type ListMethod =
  | 'VORN.Core.FileServ.NFS.Access/v1/matrix'
  | 'VORN.Core.FileServ.NFS.Client/v1/list'
  | 'VORN.Core.FileServ.NFS.History/v1/list';

interface Pages {
  /** The page that is shown, from 1. */
  page: number;
  turn: (page: number) => void;
}

/** Reads a list page by page. */
export function usePages<M extends ListMethod>(method: M, parameters: Parameters<M>) {
  const [page, turn] = useState(1);
  const part = { offset: (page - 1) * PAGE_SIZE, limit: PAGE_SIZE };
  const list = useRead<M>(method, Object.assign(part, parameters), { keepsPrevious: true });
  return { list, page, turn };
}

/** Turns the pages of a list. Nothing if it has one page only. */
export function Pager({ label, total, pages }: { label: string; total: number; pages: Pages }) {
  if (total <= PAGE_SIZE) return null;
  // The server takes an offset behind the last entry for the first one: the list became shorter meanwhile.
  const page = (pages.page - 1) * PAGE_SIZE < total ? pages.page : 1;
  return (
    <Pagination
      itemCount={total}
      perPage={PAGE_SIZE}
      perPageOptions={[]}
      page={page}
      titles={{
        paginationAriaLabel: label,
        toNextPageAriaLabel: i18n._('Next page'),
        toPreviousPageAriaLabel: i18n._('Previous page'),
        toFirstPageAriaLabel: i18n._('First page'),
        toLastPageAriaLabel: i18n._('Last page'),
        currPageAriaLabel: i18n._('Page'),
        ofWord: i18n._('of'),
      }}
      onSetPage={(_event, next) => {
        pages.turn(next);
      }}
    />
  );
}
