import { lazy, Suspense, useMemo } from 'react';
import { i18n } from '@lingui/core';
import { Card, CardBody, CardTitle, Content, ExpandableSection } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import { perSecond, time } from '../../shared/words';
import { meansOf, ratesOf, type Rate } from '../../traffic/samples';
import { useTraffic, type Traffic } from '../../traffic/sampling';

const Chart = lazy(() => import('./chart'));

const PERIOD = 300; // seconds of a row of the table

const rateText = (rate: number | null) => (rate === null ? i18n._('unknown') : perSecond(rate));

/** The newest rates, or why there are none. */
function Now({ state, newest }: { state: Traffic['state']; newest: Rate | undefined }) {
  if (state === 'unknown') return i18n._('The box has no figures: NFS is off, or the box does not answer.');
  if (state === 'idle') return i18n._('The graph waits: nobody has used this page for 15 minutes.');
  if (!newest) return i18n._('The first figures come within seconds.');
  return i18n._('Clients read {read} and write {written}.', {
    read: rateText(newest.read),
    written: rateText(newest.written),
  });
}

/** Which line is which: by its colour, and by its dashes. */
function Legend() {
  return (
    <ul className="chart-legend">
      <li className="chart-read">{i18n._('Read')}</li>
      <li className="chart-written">{i18n._('Written')}</li>
    </ul>
  );
}

function RateTable({ rates }: { rates: Rate[] }) {
  return (
    <Table aria-label={i18n._('Throughput')} variant="compact" gridBreakPoint="">
      <Thead>
        <Tr>
          <Th modifier="wrap">{i18n._('Five minutes from')}</Th>
          <Th>{i18n._('Read')}</Th>
          <Th>{i18n._('Written')}</Th>
        </Tr>
      </Thead>
      <Tbody>
        {meansOf(rates, PERIOD).map((rate) => (
          <Tr key={rate.time}>
            <Td>{time(rate.time)}</Td>
            <Td>{rateText(rate.read)}</Td>
            <Td>{rateText(rate.written)}</Td>
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

/** What clients read and wrote in the last hour, as far as this page was open. */
export function ThroughputCard() {
  const { samples, state } = useTraffic();
  const rates = useMemo(() => ratesOf(samples), [samples]);
  return (
    <Card>
      <CardTitle component="h2">{i18n._('Throughput of the last hour')}</CardTitle>
      <CardBody>
        <Content component="p">
          <Now state={state} newest={rates.at(-1)} />
        </Content>
        {(rates.length > 0 || state !== 'unknown') && (
          <>
            <Legend />
            <Suspense fallback={<div className="chart" />}>
              <Chart rates={rates} />
            </Suspense>
          </>
        )}
        <Content component="small">
          {i18n._('The box keeps no history of its throughput: the graph begins when the console is opened.')}
        </Content>
        {rates.length > 0 && (
          <ExpandableSection toggleText={i18n._('Show as a table')}>
            <RateTable rates={rates} />
          </ExpandableSection>
        )}
      </CardBody>
    </Card>
  );
}
