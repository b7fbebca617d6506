import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, Label, Title } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../../api/call';
import { useSession } from '../../session/session';
import { ConfirmDialog } from '../../shared/change-dialog';
import { Loaded } from '../../shared/page';
import { useRead } from '../../shared/use-read';
import { duration, time } from '../../shared/words';
import { roleText } from './role';

type Session = Data<'VORN.Server.Session/v1/list'>[number];

const nameOf = (session: Session) => session.account || i18n._('One-time link');

function SessionRow({ session, onEnd }: { session: Session; onEnd: () => void }) {
  const own = useSession().caller.session === session.id;
  return (
    <Tr>
      <Td dataLabel={i18n._('Account')}>
        {nameOf(session)} {own && <Label isCompact>{i18n._('this session')}</Label>}
      </Td>
      <Td dataLabel={i18n._('Role')}>{roleText(session.role)}</Td>
      <Td dataLabel={i18n._('From')}>{session.address}</Td>
      <Td dataLabel={i18n._('Signed in')}>{time(session.created)}</Td>
      <Td dataLabel={i18n._('Idle for')}>{duration(session.idle_seconds)}</Td>
      <Td className="row-actions">
        {!own && (
          <Button
            variant="link"
            isInline
            aria-label={i18n._('End the session of {name}, {time}', {
              name: nameOf(session),
              time: time(session.created),
            })}
            onClick={onEnd}
          >
            {i18n._('End')}
          </Button>
        )}
      </Td>
    </Tr>
  );
}

/** The sessions of all people. */
export function Sessions() {
  const sessions = useRead('VORN.Server.Session/v1/list', {});
  const [ended, setEnded] = useState<Session | null>(null);
  return (
    <section>
      <Title headingLevel="h2">{i18n._('Sessions')}</Title>
      <Content component="p">
        {i18n._(
          'Accounts of the box sign in with their passwords. The groups of an account decide its role: an administrator may change everything, a reader nothing.',
        )}
      </Content>
      <Loaded query={sessions}>
        {({ data }) => (
          <Table aria-label={i18n._('Sessions')} variant="compact" gridBreakPoint="grid-lg">
            <Thead>
              <Tr>
                <Th>{i18n._('Account')}</Th>
                <Th>{i18n._('Role')}</Th>
                <Th>{i18n._('From')}</Th>
                <Th>{i18n._('Signed in')}</Th>
                <Th>{i18n._('Idle for')}</Th>
                <Th screenReaderText={i18n._('Actions')} />
              </Tr>
            </Thead>
            <Tbody>
              {data.map((session) => (
                <SessionRow
                  key={session.id}
                  session={session}
                  onEnd={() => {
                    setEnded(session);
                  }}
                />
              ))}
            </Tbody>
          </Table>
        )}
      </Loaded>
      {ended && (
        <ConfirmDialog
          title={i18n._('End the session of {name}?', { name: nameOf(ended) })}
          confirm={i18n._('End the session')}
          done={i18n._('The session has ended')}
          change={{ method: 'VORN.Server.Session/v1/end', parameters: { id: ended.id }, tag: null }}
          onClose={() => {
            setEnded(null);
          }}
        >
          <Content component="p">
            {i18n._('The person has to sign in again, and loses nothing but unsaved changes.')}
          </Content>
        </ConfirmDialog>
      )}
    </section>
  );
}
