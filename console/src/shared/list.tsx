// Lists of all pages share the field that filters and the control that turns pages.
import { useDeferredValue, useState, type ReactNode } from 'react';
import { i18n } from '@lingui/core';
import { Pagination, SearchInput, Toolbar, ToolbarContent, ToolbarItem } from '@patternfly/react-core';

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

/** Turns the pages of a list. Nothing if it has one page only. */
export function Pager({
  label,
  total,
  size,
  page,
  onTurn,
}: {
  label: string;
  total: number;
  /** The number of rows of a page. */
  size: number;
  /** The page that is shown, from 1. */
  page: number;
  onTurn: (page: number) => void;
}) {
  if (total <= size) return null;
  return (
    <Pagination
      itemCount={total}
      perPage={size}
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
        onTurn(next);
      }}
    />
  );
}
