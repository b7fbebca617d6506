import { useState, type ReactNode } from 'react';
import { useMutation, useQuery, useQueryClient } from '@tanstack/react-query';
import { i18n } from '@lingui/core';
import { Button, Modal, ModalBody, ModalFooter, ModalHeader, Progress, Spinner } from '@patternfly/react-core';
import { call, Failure, type Answer, type Data, type Method, type Options, type Parameters } from '../api/call';
import { Conflict, type Fact } from './conflict';
import { PREVIEWS, readAgain, REHEARSAL } from './read-again';
import { Problem, Warnings } from './problem';
import { RehearsalView } from './rehearsal';
import { toast } from './toasts';

/** A changing call that has not been made yet. */
export interface Change<M extends Method> {
  method: M;
  parameters: Parameters<M>;
  /** The entity tag of the data that it changes; null if it may change any. */
  tag: string | null;
  form?: FormData;
}

/** How to decide between this change and one that somebody else made meanwhile. */
interface Decision {
  /** Whether this change takes the place of what is stored, or is made besides what others changed. */
  kind?: 'replaces' | 'joins';
  /** The values of this change, in words. */
  mine: Fact[];
  /** The values of the data that is stored now. */
  describe: (stored: unknown) => Fact[];
  /** Gives this change up, and shows what is stored. */
  onTakeTheirs: () => void;
}

interface Props<M extends Method> {
  title: string;
  confirm: string;
  done: string;
  change: Change<M>;
  decision?: Decision;
  isDanger?: boolean;
  onDone: (answer: Answer<Data<M>>) => void;
  onClose: () => void;
  children?: ReactNode;
}

/** How far the file of a change is sent; null while none is being sent. */
type Sent = number | null;

/** Whether the history records the calls of a method, so that they can be undone there. */
const isRecorded = (method: Method) => !method.startsWith('VORN.Server.') && !method.includes('.NFS.Client/');

/** Makes a change, and has everything that is shown read again. */
export function useChange<M extends Method>(
  done: string,
  onDone: (answer: Answer<Data<M>>) => void,
  sending: Pick<Options, 'onProgress' | 'signal'> = {},
) {
  const client = useQueryClient();
  return useMutation({
    mutationFn: ({ method, parameters, tag, form }: Change<M>) =>
      call(method, parameters, { ifMatch: tag, ...(form && { form, ...sending }) }),
    onMutate: () => client.cancelQueries({ queryKey: PREVIEWS }),
    onSuccess: async (answer, { method }) => {
      await readAgain(client);
      toast(done, { warnings: answer.warnings, isRecorded: isRecorded(method) });
      onDone(answer);
    },
  });
}

function useRehearsal<M extends Method>(
  { method, parameters, tag, form }: Change<M>,
  onProgress: (share: number) => void,
) {
  const [attempt] = useState(() => crypto.randomUUID());
  return useQuery({
    queryKey: [REHEARSAL, method, tag, attempt],
    queryFn: ({ signal }) =>
      call(method, parameters, { ifMatch: tag, rehearse: true, signal, ...(form && { form, onProgress }) }),
    staleTime: Infinity,
    gcTime: 0,
  });
}

/** What is waited for: a file to be sent, or an answer. */
function Waiting({ sent }: { sent: Sent }) {
  if (sent === null || sent === 1) return <Spinner size="lg" aria-label={i18n._('Finding out what would change')} />;
  return <Progress id="sent" title={i18n._('Sending the file')} value={Math.floor(sent * 100)} />;
}

const conflictOf = (error: unknown) => (error instanceof Failure && error.isConflict ? error : null);

/** Shows what a change would do, and makes it if that is wanted. */
export function ChangeDialog<M extends Method>(props: Props<M>) {
  const { title, confirm, done, decision, isDanger = false, onDone, onClose, children } = props;
  const [tag, setTag] = useState(props.change.tag);
  const change = { ...props.change, tag };
  const [sent, setSent] = useState<Sent>(null);
  const [saving] = useState(() => new AbortController());
  const rehearsal = useRehearsal(change, setSent);
  const save = useChange<M>(done, onDone, { onProgress: setSent, signal: saving.signal });
  const isSending = sent !== null && sent < 1;
  // A change whose call is sent cannot be given up: the dialog waits for its outcome.
  const isDecided = save.isPending && !isSending;
  const close = () => {
    if (isDecided) return;
    if (save.isPending) saving.abort(); // a rehearsal ends with the dialog
    onClose();
  };
  const start = () => {
    if (change.form) setSent(0);
    save.mutate(change);
  };
  const error = save.error ?? rehearsal.error;
  const conflict = conflictOf(error);
  const kind = decision?.kind ?? 'replaces';
  const client = useQueryClient();
  const takeTheirs = () => {
    decision?.onTakeTheirs();
    void readAgain(client);
  };
  const keepMine = () => {
    save.reset();
    setTag(conflict?.tag ?? null);
  };
  return (
    <Modal isOpen variant="medium" onClose={close} aria-labelledby="change-title">
      <ModalHeader title={title} labelId="change-title" />
      <ModalBody tabIndex={0}>
        {children}
        {(rehearsal.isPending || (save.isPending && isSending)) && <Waiting sent={sent} />}
        {conflict && decision && (
          <Conflict kind={kind} mine={decision.mine} theirs={decision.describe(conflict.details)} />
        )}
        {error && !(conflict && decision) && <Problem error={error} />}
        {!error && rehearsal.data?.rehearsal && (
          <>
            <Warnings warnings={rehearsal.data.warnings} />
            <RehearsalView rehearsal={rehearsal.data.rehearsal} />
          </>
        )}
      </ModalBody>
      <ModalFooter>
        {conflict && decision ? (
          <>
            <Button onClick={keepMine}>{kind === 'joins' ? i18n._('Go on with mine') : i18n._('Keep mine')}</Button>
            <Button variant="secondary" onClick={takeTheirs}>
              {kind === 'joins' ? i18n._('Give mine up') : i18n._('Take what is stored')}
            </Button>
          </>
        ) : (
          <Button
            variant={isDanger ? 'danger' : 'primary'}
            isLoading={save.isPending}
            isDisabled={!rehearsal.isSuccess || save.isPending}
            onClick={start}
          >
            {confirm}
          </Button>
        )}
        <Button variant="link" isDisabled={isDecided} onClick={close}>
          {i18n._('Cancel')}
        </Button>
      </ModalFooter>
    </Modal>
  );
}

/** Asks before a change that cannot be rehearsed. */
export function ConfirmDialog<M extends Method>({
  title,
  confirm,
  done,
  change,
  onClose,
  children,
}: {
  title: string;
  confirm: string;
  done: string;
  change: Change<M>;
  onClose: () => void;
  children: ReactNode;
}) {
  const save = useChange<M>(done, onClose);
  const close = () => {
    if (!save.isPending) onClose();
  };
  return (
    <Modal isOpen variant="small" onClose={close} aria-labelledby="confirm-title">
      <ModalHeader title={title} labelId="confirm-title" />
      <ModalBody>
        {save.error && <Problem error={save.error} />}
        {children}
      </ModalBody>
      <ModalFooter>
        <Button
          variant="danger"
          isLoading={save.isPending}
          isDisabled={save.isPending}
          onClick={() => {
            save.mutate(change);
          }}
        >
          {confirm}
        </Button>
        <Button variant="link" isDisabled={save.isPending} onClick={close}>
          {i18n._('Cancel')}
        </Button>
      </ModalFooter>
    </Modal>
  );
}
