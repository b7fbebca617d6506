import type { QueryClient } from '@tanstack/react-query';

/** The key of queries that ask what a change would do. Their answers are of one moment, and are never read again. */
export const REHEARSAL = 'rehearsal';

/** The key of queries that ask what a change would do while it is being edited. */
export const PREVIEWS = [REHEARSAL, 'preview'];

/** Has all data that is shown read again. */
export const readAgain = (client: QueryClient) =>
  client.invalidateQueries({ predicate: (query) => query.queryKey[0] !== REHEARSAL });
