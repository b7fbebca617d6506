import { useEffect, useRef, useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, Form, FormGroup, Title } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Parameters } from '../api/call';
import { Choices, Text } from '../shared/fields';
import { Loaded, PageFrame } from '../shared/page';
import { go, linkTo, queryOf, usePath } from '../shared/router';
import { useRead } from '../shared/use-read';
import { Explanation } from './access/explanation';
import { rightsOf } from './access/rights';
import { ShareMatrix } from './access/share-matrix';

type Question = Omit<Parameters<'VORN.Core.FileServ.NFS.Access/v1/explain'>, 'share'>;

const FLAVORS = (['sys', 'krb5', 'krb5i', 'krb5p'] as const).map((value) => ({ value, text: value }));
const VERSIONS = (['4.2', '4.1', '4.0', '3'] as const).map((value) => ({ value, text: `NFSv${value}` }));

/** Asks for a shared folder. */
function FolderChoice({ share }: { share: string }) {
  const shares = useRead('VORN.Core.Share/v1/list', {});
  const names = shares.data?.data.shares.map(({ name }) => name) ?? [share];
  const known = share === '' || names.includes(share) ? names : [share, ...names];
  return (
    <Form
      isWidthLimited
      onSubmit={(event) => {
        event.preventDefault();
      }}
    >
      <Choices
        label={i18n._('Shared folder')}
        help={i18n._('Shows the rights of all its clients.')}
        value={share}
        choices={[
          { value: '', text: i18n._('Choose a folder') },
          ...known.filter(Boolean).map((name) => ({ value: name, text: name })),
        ]}
        onChange={(name) => {
          go(name ? linkTo('access', name).slice(1) : '/access');
        }}
      />
    </Form>
  );
}

/** Asks for a client, and for how it mounts. It begins with the question that was asked last. */
function QuestionForm({ last, onAsk }: { last: Question | null; onAsk: (question: Question) => void }) {
  const [client, setClient] = useState(queryOf(usePath()).get('client') ?? last?.client ?? '');
  const [user, setUser] = useState(last?.user ?? '');
  const [flavor, setFlavor] = useState<(typeof FLAVORS)[number]['value']>(last?.flavor ?? 'sys');
  const [version, setVersion] = useState(VERSIONS.find(({ value }) => value === last?.version)?.value ?? '4.2');
  return (
    <Form
      isWidthLimited
      onSubmit={(event) => {
        event.preventDefault();
        onAsk({ client, flavor, version, user });
      }}
    >
      <Text
        label={i18n._('Client')}
        help={i18n._('A host name or an address.')}
        value={client}
        isRequired
        onChange={setClient}
      />
      <Text
        label={i18n._('User of the client (optional)')}
        help={i18n._(
          'With sys a user of the box or a user ID, with Kerberos a principal. Then the permissions of the folder count, too.',
        )}
        value={user}
        onChange={setUser}
      />
      <Choices label={i18n._('Security')} value={flavor} choices={FLAVORS} onChange={setFlavor} />
      <Choices label={i18n._('Version of NFS')} value={version} choices={VERSIONS} onChange={setVersion} />
      <FormGroup>
        <Button type="submit" isDisabled={!client}>
          {i18n._('Check')}
        </Button>
      </FormGroup>
    </Form>
  );
}

/** The rights of a client in all shared folders. A folder leads to the explanation. */
function Matrix({ question, chosen }: { question: Question; chosen: string | undefined }) {
  const matrix = useRead('VORN.Core.FileServ.NFS.Access/v1/matrix', question);
  return (
    <Loaded query={matrix}>
      {({ data }) => (
        <Table
          aria-label={i18n._('Rights of {client}', { client: question.client })}
          variant="compact"
          gridBreakPoint="grid-md"
        >
          <Thead>
            <Tr>
              <Th>{i18n._('Shared folder')}</Th>
              <Th>{i18n._('Rights')}</Th>
              <Th>{i18n._('Rule that decides')}</Th>
              <Th screenReaderText={i18n._('Actions')} />
            </Tr>
          </Thead>
          <Tbody>
            {data.access.map((access) => (
              <Tr key={access.share} isRowSelected={access.share === chosen}>
                <Td dataLabel={i18n._('Shared folder')}>{access.share}</Td>
                <Td dataLabel={i18n._('Rights')}>{rightsOf(access)}</Td>
                <Td dataLabel={i18n._('Rule that decides')}>
                  {access.rule ? <code>{access.rule}</code> : i18n._('none')}
                </Td>
                <Td className="row-actions">
                  <Button
                    variant="link"
                    isInline
                    aria-label={i18n._('Why has the client these rights in {share}?', { share: access.share })}
                    onClick={() => {
                      go(linkTo('access', access.share).slice(1));
                    }}
                  >
                    {i18n._('Why?')}
                  </Button>
                </Td>
              </Tr>
            ))}
          </Tbody>
        </Table>
      )}
    </Loaded>
  );
}

/**
 * Who can get in, and why: #/access, or #/access/SHARE for one folder. A link may name the client:
 * #/access?client=ADDRESS.
 */
export default function AccessPage({ rest }: { rest: string[] }) {
  const [share] = rest;
  const [question, setQuestion] = useState<Question | null>(null);
  const answer = useRef<HTMLElement>(null);
  useEffect(() => {
    if (question) answer.current?.focus(); // the answer may be out of sight
  }, [question]);
  return (
    <PageFrame
      title={i18n._('Access check')}
      purpose={i18n._('What a client may do in the shared folders, and why it can or cannot mount one of them.')}
    >
      <div className="stack">
        <section className="stack">
          <Title headingLevel="h2">{i18n._('Who can get into a folder?')}</Title>
          <FolderChoice share={share ?? ''} />
          {share && (
            <ShareMatrix
              share={share}
              onAsk={({ address, version }) => {
                if (address !== null) setQuestion({ client: address, flavor: 'sys', version });
              }}
            />
          )}
        </section>
        <section className="stack">
          <Title headingLevel="h2">{i18n._('What may a client do, and why?')}</Title>
          <QuestionForm key={JSON.stringify(question)} last={question} onAsk={setQuestion} />
        </section>
        {question && (
          <section ref={answer} tabIndex={-1} aria-live="polite">
            <Title headingLevel="h2">{i18n._('Rights of {client}', { client: question.client })}</Title>
            <Matrix question={question} chosen={share} />
          </section>
        )}
        {question && share && <Explanation question={{ ...question, share }} />}
        {question && !share && <Content component="p">{i18n._('Choose "Why?" to see what decides.')}</Content>}
      </div>
    </PageFrame>
  );
}
