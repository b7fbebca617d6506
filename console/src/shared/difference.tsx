import { i18n } from '@lingui/core';

type Kind = 'added' | 'removed' | 'place' | 'same';

export interface Line {
  kind: Kind;
  text: string;
}

/** The lines of a difference in the unified format of diff(1), without the two lines that name the file. */
export function linesOf(difference: string): Line[] {
  const lines = difference.replace(/\n$/, '').split('\n');
  const body = lines[0]?.startsWith('--- ') && lines[1]?.startsWith('+++ ') ? lines.slice(2) : lines;
  return body.map((line) => ({ kind: kindOf(line), text: line }));
}

function kindOf(line: string): Kind {
  if (line.startsWith('+')) return 'added';
  if (line.startsWith('-')) return 'removed';
  return line.startsWith('@@') ? 'place' : 'same';
}

/** The lines that a difference adds, without their marks. */
export const addedLines = (difference: string) =>
  linesOf(difference)
    .filter((line) => line.kind === 'added')
    .map((line) => line.text.slice(1));

/** A changed file. The mark at the beginning of each line tells what the colour tells. */
export function Difference({ path, difference }: { path: string; difference: string }) {
  return (
    <figure className="difference">
      <figcaption>
        <code>{path}</code>
      </figcaption>
      {/* A region that scrolls must be reachable by keyboard. */}
      {/* eslint-disable-next-line jsx-a11y/no-noninteractive-tabindex */}
      <pre tabIndex={0} role="region" aria-label={i18n._('Changes of {path}', { path })}>
        {linesOf(difference).map((line, index) => (
          <span key={index} className={`difference-${line.kind}`}>
            {line.text + '\n'}
          </span>
        ))}
      </pre>
    </figure>
  );
}
