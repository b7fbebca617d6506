import { i18n } from '@lingui/core';
import {
  Button,
  Content,
  DescriptionList,
  Modal,
  ModalBody,
  ModalFooter,
  ModalHeader,
  Title,
} from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import { DescriptionItem } from '../../shared/description-item';
import { duration, volume, yesNo } from '../../shared/words';
import { identityOf, nameOf, stateOf, timeOr, versionOf, type Client, type ClientExport } from './words';

function Facts({ client }: { client: Client }) {
  const state = stateOf(client);
  return (
    <DescriptionList isCompact isHorizontal horizontalTermWidthModifier={{ sm: '20ch' }}>
      <DescriptionItem term={i18n._('It calls itself')}>{client.name ?? i18n._('unknown')}</DescriptionItem>
      <DescriptionItem term={i18n._('Software')}>{client.implementation ?? i18n._('unknown')}</DescriptionItem>
      <DescriptionItem term={i18n._('Version')}>{versionOf(client)}</DescriptionItem>
      <DescriptionItem term={i18n._('State')}>{state.meaning ?? state.text}</DescriptionItem>
      <DescriptionItem term={i18n._('Since')}>{timeOr(client.since)}</DescriptionItem>
      {client.renewed !== null && (
        <DescriptionItem term={i18n._('Last sign of life')}>
          {i18n._('{duration} ago', { duration: duration(Math.max(0, client.renewed)) })}
        </DescriptionItem>
      )}
      {!!client.delegations && (
        <DescriptionItem term={i18n._('Files that it may cache alone')}>
          {i18n.number(client.delegations)}
        </DescriptionItem>
      )}
    </DescriptionList>
  );
}

const volumeOr = (count: number | null) => (count === null ? i18n._('not visible') : volume(count));

function Exports({ exports }: { exports: ClientExport[] }) {
  if (exports.length === 0) return <Content component="p">{i18n._('The box knows of none.')}</Content>;
  return (
    <>
      <Content component="p">
        {i18n._(
          'The box counts bytes for each rule, not for each client: the amounts are those of all clients that the rule admits.',
        )}
      </Content>
      <Table aria-label={i18n._('Folders in use')} variant="compact" gridBreakPoint="grid-lg">
        <Thead>
          <Tr>
            <Th>{i18n._('Folder')}</Th>
            <Th>{i18n._('Rule')}</Th>
            <Th>{i18n._('Read')}</Th>
            <Th>{i18n._('Written')}</Th>
            <Th>{i18n._('Counted since')}</Th>
            <Th modifier="wrap">{i18n._('Mount of NFSv3')}</Th>
          </Tr>
        </Thead>
        <Tbody>
          {exports.map((each) => (
            <Tr key={each.path}>
              <Td dataLabel={i18n._('Folder')}>
                <code>{each.path}</code>
              </Td>
              <Td dataLabel={i18n._('Rule')}>{each.rule === null ? i18n._('unknown') : <code>{each.rule}</code>}</Td>
              <Td dataLabel={i18n._('Read')}>{volumeOr(each.bytes_read)}</Td>
              <Td dataLabel={i18n._('Written')}>{volumeOr(each.bytes_written)}</Td>
              <Td dataLabel={i18n._('Counted since')}>{timeOr(each.since)}</Td>
              <Td dataLabel={i18n._('Mount of NFSv3')}>{yesNo(each.mounted)}</Td>
            </Tr>
          ))}
        </Tbody>
      </Table>
    </>
  );
}

/** All that the box knows of one client, and what can be done about it. */
export function ClientDetails({ client, onClose }: { client: Client; onClose: () => void }) {
  return (
    <Modal isOpen variant="large" onClose={onClose} aria-labelledby="client-details">
      <ModalHeader title={nameOf(client)} labelId="client-details" />
      <ModalBody tabIndex={0}>
        <div className="stack">
          <Facts client={client} />
          <section>
            <Title headingLevel="h2" size="md">
              {i18n._('Folders in use')}
            </Title>
            <Exports exports={client.exports} />
          </section>
          {!identityOf(client) && (
            <Content component="p">
              {i18n._(
                'The box keeps no state of this client that could be ended. To keep it out, change the rules of the folders.',
              )}
            </Content>
          )}
          {client.address !== null && (
            <a href={`#/access?client=${encodeURIComponent(client.address)}`}>
              {i18n._('What may this client do, and why?')}
            </a>
          )}
        </div>
      </ModalBody>
      <ModalFooter>
        <Button onClick={onClose}>{i18n._('Close')}</Button>
      </ModalFooter>
    </Modal>
  );
}
