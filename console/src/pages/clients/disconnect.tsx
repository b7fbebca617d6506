import { i18n } from '@lingui/core';
import { Content, List, ListItem } from '@patternfly/react-core';
import { ChangeDialog } from '../../shared/change-dialog';
import { identityOf, nameOf, type Client } from './words';

/** Asks before a client loses its state, and says what it will notice. */
export function Disconnect({ client, onClose }: { client: Client; onClose: () => void }) {
  const parameters = identityOf(client);
  if (!parameters) return null;
  const counts = { files: client.open_files ?? 0, locks: client.locks ?? 0 };
  return (
    <ChangeDialog
      title={i18n._('Disconnect {name}?', { name: nameOf(client) })}
      confirm={i18n._('Disconnect')}
      done={i18n._('The client was disconnected')}
      isDanger
      // No reading method shows the state of one client: client_id names the client that is meant.
      change={{ method: 'VORN.Core.FileServ.NFS.Client/v1/disconnect', parameters, tag: null }}
      onDone={onClose}
      onClose={onClose}
    >
      <Content component="p">
        {i18n._(
          'The box forgets what this client has: {files, plural, =0 {no open files} one {# open file} other {# open files}}, {locks, plural, =0 {no locks} one {# lock} other {# locks}}.',
          counts,
        )}
      </Content>
      <List>
        <ListItem>
          {i18n._(
            'A client that works makes itself known again at its next request. It waits for a moment, and gets its files and locks again.',
          )}
        </ListItem>
        <ListItem>
          {i18n._('If another client takes a lock before that, the program that had it gets an error.')}
        </ListItem>
        <ListItem>
          {i18n._('This does not keep the client out. To do that, change the rules of the shared folder.')}
        </ListItem>
      </List>
    </ChangeDialog>
  );
}
