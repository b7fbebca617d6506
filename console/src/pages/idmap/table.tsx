import { memo, useRef, useState } from 'react';
import { useVirtualizer } from '@tanstack/react-virtual';
import { i18n } from '@lingui/core';
import { Button, Content, Skeleton } from '@patternfly/react-core';
import { Table, Tbody, Th, Thead, Tr } from '@patternfly/react-table';
import { Loaded } from '../../shared/page';
import { useMappings, type Mapping } from './data';

type Choose = (chosen: { mapping: Mapping; wish: 'change' | 'delete' }) => void;

const ROW_HEIGHT = 45; // pixels, as an estimate
const CELL = 'pf-v6-c-table__td';

function RowActions({ mapping, onChoose }: { mapping: Mapping; onChoose: Choose }) {
  const button = (wish: 'change' | 'delete', text: string, label: string) => (
    <Button
      variant="link"
      isInline
      aria-label={label}
      onClick={() => {
        onChoose({ mapping, wish });
      }}
    >
      {text}
    </Button>
  );
  const { id } = mapping;
  return (
    <>
      {button('change', i18n._('Change'), i18n._('Change the mapping of {id}', { id }))}{' '}
      {button('delete', i18n._('Delete'), i18n._('Delete the mapping of {id}', { id }))}
    </>
  );
}

// Plain cells, rendered once: PatternFly's components and repeated rendering cost frames while scrolling.
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

/** The mappings that match. Only the rows in sight are rendered, and only their pages are read. */
export function MappingTable({ filter, onChoose }: { filter: string; onChoose: Choose | null }) {
  const box = useRef<HTMLDivElement>(null);
  const [range, setRange] = useState({ first: 0, last: 40 });
  const { head, total, row } = useMappings(filter, range.first, range.last);
  const rows = useVirtualizer({
    count: total,
    getScrollElement: () => box.current,
    estimateSize: () => ROW_HEIGHT,
    overscan: 10,
    onChange: ({ range: seen }) => {
      if (!seen) return;
      setRange((old) =>
        old.first === seen.startIndex && old.last === seen.endIndex
          ? old
          : { first: seen.startIndex, last: seen.endIndex },
      );
    },
  });
  const items = rows.getVirtualItems();
  const label = i18n._('ID mappings');
  return (
    <Loaded query={head}>
      {() => (
        <>
          <Content component="p">
            {i18n._('{n, plural, =0 {No mapping} one {# mapping} other {# mappings}}', { n: total })}
          </Content>
          {/* A region that scrolls must be reachable by keyboard. */}
          {/* eslint-disable-next-line jsx-a11y/no-noninteractive-tabindex */}
          <div ref={box} className="rows" hidden={total === 0} tabIndex={0} role="region" aria-label={label}>
            <Table aria-label={label} aria-rowcount={total + 1} variant="compact" isStickyHeader gridBreakPoint="">
              <Thead>
                <Tr>
                  <Th>{i18n._('Principal')}</Th>
                  <Th>{i18n._('User of the box')}</Th>
                  {onChoose && <Th screenReaderText={i18n._('Actions')} />}
                </Tr>
              </Thead>
              <Tbody>
                <Spacer height={items[0]?.start ?? 0} />
                {items.map(({ index, key }) => (
                  <Row key={key} index={index} mapping={row(index)} onChoose={onChoose} />
                ))}
                <Spacer height={rows.getTotalSize() - (items.at(-1)?.end ?? 0)} />
              </Tbody>
            </Table>
          </div>
        </>
      )}
    </Loaded>
  );
}
