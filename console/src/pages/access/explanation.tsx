import { i18n } from '@lingui/core';
import { Label, List, ListItem, Title } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data, Parameters } from '../../api/call';
import { Loaded } from '../../shared/page';
import { useRead } from '../../shared/use-read';

type Answer = Data<'VORN.Core.FileServ.NFS.Access/v1/explain'>;
type Check = Answer['checks'][number];

const RESULTS: Record<Check['result'], { text: string; color: 'green' | 'red' | 'grey' }> = {
  passed: { text: /*i18n*/ 'passed', color: 'green' },
  failed: { text: /*i18n*/ 'failed', color: 'red' },
  unknown: { text: /*i18n*/ 'cannot be told', color: 'grey' },
};

/** What stands in the way comes first. */
const byImportance = (a: Check, b: Check) => order(a) - order(b);
const order = ({ result }: Check) => ['failed', 'unknown', 'passed'].indexOf(result);

const NAMES: Record<string, string> = {
  service: /*i18n*/ 'Service',
  version: /*i18n*/ 'Version of NFS',
  firewall: /*i18n*/ 'Firewall',
  name: /*i18n*/ 'Name of the client',
  rule: /*i18n*/ 'Rule',
  flavor: /*i18n*/ 'Security',
  port: /*i18n*/ 'Port of the client',
  keytab: /*i18n*/ 'Keytab',
  way: /*i18n*/ 'Way to the folder',
  folder: /*i18n*/ 'Folder',
  read: /*i18n*/ 'Reading',
  write: /*i18n*/ 'Writing',
  reload: /*i18n*/ 'Rules in force',
};

const nameOf = ({ check }: Check) => {
  const name = NAMES[check];
  return name ? i18n._(name) : check;
};

function Verdict({ answer }: { answer: Answer }) {
  const failed = answer.checks.some((check) => check.result === 'failed');
  const text = answer.mountable
    ? i18n._('The client can mount the folder')
    : i18n._('The client cannot mount the folder');
  return (
    <Title headingLevel="h2">
      {text} <Label color={answer.mountable ? (failed ? 'orange' : 'green') : 'red'}>{answer.path}</Label>
    </Title>
  );
}

function Checks({ checks }: { checks: Check[] }) {
  return (
    <Table aria-label={i18n._('Conditions')} variant="compact" gridBreakPoint="grid-md">
      <Thead>
        <Tr>
          <Th>{i18n._('Condition')}</Th>
          <Th>{i18n._('Result')}</Th>
          <Th>{i18n._('What the box says')}</Th>
        </Tr>
      </Thead>
      <Tbody>
        {checks.toSorted(byImportance).map((check) => (
          <Tr key={check.check}>
            <Td dataLabel={i18n._('Condition')}>{nameOf(check)}</Td>
            <Td dataLabel={i18n._('Result')}>
              <Label color={RESULTS[check.result].color}>{i18n._(RESULTS[check.result].text)}</Label>
            </Td>
            <Td dataLabel={i18n._('What the box says')} lang="en">
              {check.text} {check.remedy && <strong>{check.remedy}</strong>}
            </Td>
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

/** Why a client may do what it may do in one folder. */
export function Explanation({ question }: { question: Parameters<'VORN.Core.FileServ.NFS.Access/v1/explain'> }) {
  const explanation = useRead('VORN.Core.FileServ.NFS.Access/v1/explain', question);
  return (
    <section aria-live="polite" className="stack">
      <Loaded query={explanation}>
        {({ data }) => (
          <>
            <Verdict answer={data} />
            <Checks checks={data.checks} />
            {data.others.length > 0 && (
              <>
                <Title headingLevel="h3">{i18n._('Rules that lose')}</Title>
                <List lang="en">
                  {data.others.map((rule) => (
                    <ListItem key={rule.text}>{rule.text}</ListItem>
                  ))}
                </List>
              </>
            )}
            {data.identity && <p lang="en">{data.identity.text}</p>}
          </>
        )}
      </Loaded>
    </section>
  );
}
