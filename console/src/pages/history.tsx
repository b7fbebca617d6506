import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, EmptyState, Modal, ModalBody, ModalFooter, ModalHeader } from '@patternfly/react-core';
import type { Answer, Data } from '../api/call';
import { useMayWrite } from '../session/session';
import { ChangeDialog } from '../shared/change-dialog';
import type { Fact } from '../shared/conflict';
import { Difference } from '../shared/difference';
import { Pager, usePages } from '../shared/list';
import { Loaded, PageFrame, ReadOnlyNotice } from '../shared/page';
import { useRead } from '../shared/use-read';
import { time } from '../shared/words';
import { callerOf, ChangeTable, subjectOf, type HistoryChange } from './changes';

/** The differences of one change. */
function ShowChange({ change, onClose }: { change: HistoryChange; onClose: () => void }) {
  const shown = useRead('VORN.Core.FileServ.NFS.History/v1/show', { id: change.id });
  return (
    <Modal isOpen variant="large" onClose={onClose} aria-labelledby="show-change">
      <ModalHeader title={subjectOf(change)} description={time(change.time)} labelId="show-change" />
      <ModalBody tabIndex={0}>
        <Loaded query={shown}>
          {({ data }) =>
            data.differences.length === 0 ? (
              <Content component="p">{i18n._('No difference of a file is known.')}</Content>
            ) : (
              <div className="stack">
                {data.differences.map((file) => (
                  <Difference key={file.path} {...file} />
                ))}
              </div>
            )
          }
        </Loaded>
      </ModalBody>
      <ModalFooter>
        <Button onClick={onClose}>{i18n._('Close')}</Button>
      </ModalFooter>
    </Modal>
  );
}

type Page = Data<'VORN.Core.FileServ.NFS.History/v1/list'>;

/** The changes that were made since the newest one of those that were seen. */
function newerThan(seen: HistoryChange[], stored: HistoryChange[]): Fact[] {
  const ids = new Set(seen.map(({ id }) => id));
  const end = stored.findIndex(({ id }) => ids.has(id));
  return stored.slice(0, end < 0 ? stored.length : end).map((change) => ({
    label: `${time(change.time)} ${subjectOf(change)}`,
    text: [callerOf(change), ...change.files].join(', '),
  }));
}

function UndoChange({ change, shown, onClose }: { change: HistoryChange; shown: Answer<Page>; onClose: () => void }) {
  const [seen] = useState(shown); // another answer may come while the dialog is open
  return (
    <ChangeDialog
      title={i18n._('What undoing this change does')}
      confirm={i18n._('Undo the change')}
      done={i18n._('The change was undone')}
      change={{ method: 'VORN.Core.FileServ.NFS.History/v1/undo', parameters: { id: change.id }, tag: seen.tag }}
      decision={{
        kind: 'joins',
        mine: [],
        describe: (stored) => newerThan(seen.data.changes, (stored as Page).changes),
        onTakeTheirs: onClose,
      }}
      onDone={onClose}
      onClose={onClose}
    />
  );
}

interface Chosen {
  change: HistoryChange;
  wish: 'show' | 'undo';
}

function Actions({ change, onChoose }: { change: HistoryChange; onChoose: (chosen: Chosen) => void }) {
  const mayWrite = useMayWrite();
  const canBeUndone = mayWrite && change.kind !== 'found' && change.files.length > 0;
  const about = { subject: subjectOf(change), time: time(change.time) };
  return (
    <>
      <Button
        variant="link"
        isInline
        aria-label={i18n._('Show {subject}, {time}', about)}
        onClick={() => {
          onChoose({ change, wish: 'show' });
        }}
      >
        {i18n._('Show')}
      </Button>{' '}
      {canBeUndone && (
        <Button
          variant="link"
          isInline
          aria-label={i18n._('Undo {subject}, {time}', about)}
          onClick={() => {
            onChoose({ change, wish: 'undo' });
          }}
        >
          {i18n._('Undo')}
        </Button>
      )}
    </>
  );
}

export default function HistoryPage() {
  const [chosen, setChosen] = useState<Chosen | null>(null);
  const pages = usePages('VORN.Core.FileServ.NFS.History/v1/list', {});
  const history = pages.list;
  const close = () => {
    setChosen(null);
  };
  return (
    <PageFrame
      title={i18n._('History')}
      purpose={i18n._('Who changed which file of the box, and when. Edits by hand are listed, too.')}
    >
      <ReadOnlyNotice />
      <Loaded query={history}>
        {({ data }) =>
          data.total === 0 ? (
            <EmptyState headingLevel="h2" titleText={i18n._('Nothing has been changed yet.')} />
          ) : (
            <>
              <ChangeTable
                changes={data.changes}
                label={i18n._('Changes')}
                actions={(change) => <Actions change={change} onChoose={setChosen} />}
              />
              <Pager label={i18n._('Pages of the history')} total={data.total} pages={pages} />
            </>
          )
        }
      </Loaded>
      {chosen?.wish === 'show' && <ShowChange change={chosen.change} onClose={close} />}
      {chosen?.wish === 'undo' && history.data && (
        <UndoChange change={chosen.change} shown={history.data} onClose={close} />
      )}
    </PageFrame>
  );
}
