import { i18n } from '@lingui/core';
import { ClipboardCopy, Content, MenuToggle } from '@patternfly/react-core';
import EllipsisVIcon from '@patternfly/react-icons/dist/esm/icons/ellipsis-v-icon';
import { ActionsColumn, Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import { useMayWrite } from '../../session/session';
import { mountCommand, optionsText, privilegeText, securityText, squashText, type StoredRule } from './rule';

export interface RuleActions {
  onEdit: (index: number) => void;
  onMove: (index: number, to: number) => void;
  onCopy: (index: number) => void;
  onDelete: (index: number) => void;
}

function Menu({
  index,
  count,
  client,
  actions,
}: {
  index: number;
  count: number;
  client: string;
  actions: RuleActions;
}) {
  const item = (title: string, onClick: () => void, isDisabled = false) => ({ title, onClick, isDisabled });
  return (
    <ActionsColumn
      actionsToggle={({ onToggle, isOpen, isDisabled, toggleRef }) => (
        <MenuToggle
          ref={toggleRef}
          variant="plain"
          icon={<EllipsisVIcon />}
          aria-label={i18n._('Actions of rule {n}, {client}', { n: index + 1, client })}
          isExpanded={isOpen}
          isDisabled={isDisabled}
          onClick={onToggle}
        />
      )}
      items={[
        item(i18n._('Change'), () => {
          actions.onEdit(index);
        }),
        item(i18n._('Copy'), () => {
          actions.onCopy(index);
        }),
        item(
          i18n._('Move up'),
          () => {
            actions.onMove(index, index - 1);
          },
          index === 0,
        ),
        item(
          i18n._('Move down'),
          () => {
            actions.onMove(index, index + 1);
          },
          index === count - 1,
        ),
        item(i18n._('Delete'), () => {
          actions.onDelete(index);
        }),
      ]}
    />
  );
}

/** The rules of a folder, in the order in which the box reads them. */
export function RuleTable({ rules, actions }: { rules: StoredRule[]; actions: RuleActions }) {
  const mayWrite = useMayWrite();
  return (
    <Table aria-label={i18n._('Rules')} gridBreakPoint="grid-lg" variant="compact">
      <Thead>
        <Tr>
          <Th>{i18n._('No.')}</Th>
          <Th>{i18n._('Client')}</Th>
          <Th>{i18n._('Access')}</Th>
          <Th>{i18n._('Users')}</Th>
          <Th modifier="nowrap">{i18n._('Security')}</Th>
          <Th>{i18n._('Options')}</Th>
          {mayWrite && <Th screenReaderText={i18n._('Actions')} />}
        </Tr>
      </Thead>
      <Tbody>
        {rules.map((rule, index) => (
          <Tr key={index}>
            <Td dataLabel={i18n._('No.')}>{index + 1}</Td>
            <Td dataLabel={i18n._('Client')}>
              <code>{rule.client}</code>
            </Td>
            <Td dataLabel={i18n._('Access')}>{privilegeText(rule)}</Td>
            <Td dataLabel={i18n._('Users')}>{squashText(rule)}</Td>
            <Td dataLabel={i18n._('Security')}>{securityText(rule)}</Td>
            <Td dataLabel={i18n._('Options')}>{optionsText(rule) || '–'}</Td>
            {mayWrite && (
              <Td isActionCell>
                <Menu index={index} count={rules.length} client={rule.client} actions={actions} />
              </Td>
            )}
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

/** The commands with which clients mount the folder, one for each different one. */
export function MountCommands({ rules, path, name }: { rules: StoredRule[]; path: string; name: string }) {
  const commands = [...new Set(rules.map((rule) => mountCommand(rule, location.hostname, path, name)))];
  if (commands.length === 0) return null;
  return (
    <section>
      <Content component="h2">{i18n._('How a client mounts the folder')}</Content>
      {commands.map((command) => (
        <ClipboardCopy
          key={command}
          isReadOnly
          isCode
          hoverTip={i18n._('Copy')}
          clickTip={i18n._('Copied')}
          textAriaLabel={i18n._('Mount command')}
          toggleAriaLabel={i18n._('Show the whole command')}
        >
          {command}
        </ClipboardCopy>
      ))}
    </section>
  );
}
