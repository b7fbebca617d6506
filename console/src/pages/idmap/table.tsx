import { memo, useCallback, useEffect, useRef, useState } from 'react';
import { useVirtualizer } from '@tanstack/react-virtual';
import { i18n } from '@lingui/core';
import { Content, EmptyState, Skeleton } from '@patternfly/react-core';
import { Loaded } from '../../shared/page';
import { pagesOf, useMappings, type Mapping, type Pages } from './data';

type Choose = (chosen: { mapping: Mapping; wish: 'change' | 'delete' }) => void;
type RowOf = ReturnType<typeof useMappings>['row'];

const ROW_HEIGHT = 45; // pixels; console.css has the same
const CELL = 'pf-v6-c-table__td';
const HEAD = 'pf-v6-c-table__th';

// Plain elements with PatternFly's classes: its components cost frames while scrolling.

function Action({ text, label, onClick }: { text: string; label: string; onClick: () => void }) {
  return (
    <button type="button" className="pf-v6-c-button pf-m-link pf-m-inline" aria-label={label} onClick={onClick}>
      {text}
    </button>
  );
}

function RowActions({ mapping, onChoose }: { mapping: Mapping; onChoose: Choose }) {
  const { id } = mapping;
  return (
    <>
      <Action
        text={i18n._('Change')}
        label={i18n._('Change the mapping of {id}', { id })}
        onClick={() => {
          onChoose({ mapping, wish: 'change' });
        }}
      />{' '}
      <Action
        text={i18n._('Delete')}
        label={i18n._('Delete the mapping of {id}', { id })}
        onClick={() => {
          onChoose({ mapping, wish: 'delete' });
        }}
      />
    </>
  );
}

/** A row, which is rendered once. */
const Row = memo(function Row({
  index,
  mapping,
  onChoose,
}: {
  index: number;
  mapping: Mapping | undefined;
  onChoose: Choose | null;
}) {
  return (
    <tr className="pf-v6-c-table__tr" aria-rowindex={index + 2}>
      <td className={CELL}>
        {mapping ? mapping.kerberos_principal : <Skeleton screenreaderText={i18n._('Loading')} />}
      </td>
      <td className={CELL}>{mapping?.local_name}</td>
      {onChoose && <td className={CELL}>{mapping && <RowActions mapping={mapping} onChoose={onChoose} />}</td>}
    </tr>
  );
});

/** Takes the height of the rows that are not rendered. */
function Spacer({ height }: { height: number }) {
  if (height <= 0) return null;
  return (
    <tr aria-hidden>
      <td colSpan={3} style={{ height, padding: 0 }} />
    </tr>
  );
}

const Head = memo(function Head({ hasActions }: { hasActions: boolean }) {
  return (
    <thead className="pf-v6-c-table__thead">
      <tr className="pf-v6-c-table__tr" aria-rowindex={1}>
        <th className={HEAD} scope="col">
          {i18n._('Principal')}
        </th>
        <th className={HEAD} scope="col">
          {i18n._('User of the box')}
        </th>
        {hasActions && (
          <th className={HEAD} scope="col">
            <span className="pf-v6-screen-reader">{i18n._('Actions')}</span>
          </th>
        )}
      </tr>
    </thead>
  );
});

/** Renders only the rows in sight, and tells which pages they are of. */
const Rows = memo(function Rows({
  total,
  row,
  onPages,
  onChoose,
}: {
  total: number;
  row: RowOf;
  onPages: (pages: Pages) => void;
  onChoose: Choose | null;
}) {
  const box = useRef<HTMLDivElement>(null);
  const rows = useVirtualizer({
    count: total,
    getScrollElement: () => box.current,
    estimateSize: () => ROW_HEIGHT,
    overscan: 10,
  });
  const items = rows.getVirtualItems();
  const { first, last } = pagesOf(items[0]?.index ?? 0, items.at(-1)?.index ?? 0);
  useEffect(() => {
    onPages({ first, last });
  }, [onPages, first, last]);
  const label = i18n._('ID mappings');
  return (
    // A region that scrolls must be reachable by keyboard.
    // eslint-disable-next-line jsx-a11y/no-noninteractive-tabindex
    <div ref={box} className="rows" hidden={total === 0} tabIndex={0} role="region" aria-label={label}>
      <table
        className="pf-v6-c-table pf-m-compact pf-m-sticky-header"
        role="grid"
        aria-label={label}
        aria-rowcount={total + 1}
      >
        <Head hasActions={onChoose !== null} />
        <tbody className="pf-v6-c-table__tbody">
          <Spacer height={items[0]?.start ?? 0} />
          {items.map(({ index, key }) => (
            <Row key={key} index={index} mapping={row(index)} onChoose={onChoose} />
          ))}
          <Spacer height={rows.getTotalSize() - (items.at(-1)?.end ?? 0)} />
        </tbody>
      </table>
    </div>
  );
});

/** The mappings that match. Only the pages of the rows in sight are read. */
export function MappingTable({ filter, onChoose }: { filter: string; onChoose: Choose | null }) {
  const [pages, setPages] = useState<Pages>({ first: 0, last: 0 });
  const { head, total, row } = useMappings(filter, pages);
  const showPages = useCallback((next: Pages) => {
    setPages((old) => (old.first === next.first && old.last === next.last ? old : next));
  }, []);
  return (
    <Loaded query={head}>
      {() =>
        total === 0 && filter === '' ? (
          <EmptyState headingLevel="h2" titleText={i18n._('No principal is mapped yet')}>
            {i18n._('Clients that use Kerberos get the user of the box with the name of their principal.')}
          </EmptyState>
        ) : (
          <>
            <Content component="p">
              {i18n._('{n, plural, =0 {No mapping} one {# mapping} other {# mappings}}', { n: total })}
            </Content>
            <Rows total={total} row={row} onPages={showPages} onChoose={onChoose} />
          </>
        )
      }
    </Loaded>
  );
}
