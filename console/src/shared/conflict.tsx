import { i18n } from '@lingui/core';
import { Content } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';

/** A value in words, as a person at the page knows it. */
export interface Fact {
  label: string;
  text: string;
}

export interface Contrast {
  label: string;
  mine: string;
  theirs: string;
}

/** The values in which two versions differ, in their order. */
export function contrasts(mine: Fact[], theirs: Fact[]): Contrast[] {
  const labels = [...new Set([...mine, ...theirs].map((fact) => fact.label))];
  const textOf = (facts: Fact[], label: string) => facts.find((fact) => fact.label === label)?.text ?? '–';
  return labels
    .map((label) => ({ label, mine: textOf(mine, label), theirs: textOf(theirs, label) }))
    .filter((contrast) => contrast.mine !== contrast.theirs);
}

/** Shows how the edited version and the one that was stored meanwhile differ. */
export function Conflict({ kind, mine, theirs }: { kind: 'replaces' | 'joins'; mine: Fact[]; theirs: Fact[] }) {
  const rows = contrasts(mine, theirs);
  return (
    <>
      <Content component="p">
        {kind === 'joins'
          ? i18n._('Somebody else has changed this since the page read it. Decide whether your change still fits.')
          : i18n._('Somebody else has saved other values since you opened this page. Decide which ones are to stay.')}
      </Content>
      <Table aria-label={i18n._('Differences')} variant="compact" gridBreakPoint="">
        <Thead>
          <Tr>
            <Th>{i18n._('Setting')}</Th>
            <Th>{kind === 'joins' ? i18n._('What you saw, with your change') : i18n._('Yours')}</Th>
            <Th>{i18n._('Stored meanwhile')}</Th>
          </Tr>
        </Thead>
        <Tbody>
          {rows.map((row) => (
            <Tr key={row.label}>
              <Th scope="row">{row.label}</Th>
              <Td>{row.mine}</Td>
              <Td>{row.theirs}</Td>
            </Tr>
          ))}
        </Tbody>
      </Table>
      {rows.length === 0 && <Content component="p">{i18n._('Both have the same values in the end.')}</Content>}
    </>
  );
}
