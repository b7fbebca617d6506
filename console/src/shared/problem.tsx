import { i18n } from '@lingui/core';
import { Alert, Content, List, ListItem } from '@patternfly/react-core';
import { Failure, Unreachable } from '../api/call';
import { errorTexts } from '../api/errors';
import { remedies } from './remedies';
import { statusTexts } from './status-texts';

/** What happened, in the language of the page. */
function textOf(error: unknown): string {
  if (error instanceof Unreachable) return i18n._('The box does not answer.');
  if (!(error instanceof Failure)) return i18n._('The page has a fault.');
  const text = errorTexts[error.code] ?? statusTexts[error.code];
  return text ? i18n._(text) : error.message;
}

/** What the person at the page can do about it. */
function remedyOf(error: unknown): string {
  if (error instanceof Unreachable) return i18n._('Check that the box is switched on and that the network works.');
  const remedy = error instanceof Failure ? remedies[error.code] : undefined;
  return remedy ? i18n._(remedy) : i18n._('Reload the page and try again.');
}

/** The principals that are mapped already: the only details that an error of a change has. */
export function conflictsOf(error: unknown): string[] {
  const details = error instanceof Failure && !error.isConflict ? error.details : null;
  const conflicts = (details as { principal_conflict?: string[] } | null | undefined)?.principal_conflict;
  return conflicts ?? [];
}

/** Why it happened, in the server's own words. */
function reasonsOf(error: unknown): string[] {
  if (!(error instanceof Failure))
    return error instanceof Error && !(error instanceof Unreachable) ? [error.message] : [];
  const isStatus = error.code < 1000;
  return isStatus && error.message ? [error.message, ...error.reasons] : [...error.reasons, ...conflictsOf(error)];
}

function Reasons({ reasons }: { reasons: string[] }) {
  if (reasons.length === 0) return null;
  return (
    <List>
      {reasons.map((reason) => (
        <ListItem key={reason} lang="en">
          {reason}
        </ListItem>
      ))}
    </List>
  );
}

/** An error: what happened, its code, the reasons, and what can be done. */
export function Problem({ error, title }: { error: unknown; title?: string }) {
  const text = textOf(error);
  return (
    <Alert variant="danger" isInline component="h2" title={title ?? text} role="alert" className="problem">
      {title && <Content component="p">{text}</Content>}
      <Reasons reasons={reasonsOf(error)} />
      <Content component="p">{remedyOf(error)}</Content>
      {error instanceof Failure && (
        <Content component="small">{i18n._('Error code {code}', { code: String(error.code) })}</Content>
      )}
    </Alert>
  );
}

/** Remarks of a call that succeeded. */
export function Warnings({ warnings }: { warnings: string[] }) {
  if (warnings.length === 0) return null;
  return (
    <Alert variant="warning" isInline component="h2" title={i18n._('The server remarks')}>
      <Reasons reasons={warnings} />
    </Alert>
  );
}
