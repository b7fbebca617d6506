import { useState } from 'react';
import { i18n } from '@lingui/core';
import {
  Alert,
  Content,
  Form,
  FormGroup,
  FormHelperText,
  HelperText,
  HelperTextItem,
  Label,
  Title,
} from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import type { Data } from '../api/call';
import { useMayWrite } from '../session/session';
import { ChangeDialog } from '../shared/change-dialog';
import { FileField } from '../shared/file-field';
import { FindingAlert } from '../shared/finding';
import { Loaded, PageFrame, ReadOnlyNotice } from '../shared/page';
import { useRead } from '../shared/use-read';

type Keytab = Data<'VORN.Core.FileServ.NFS.Kerberos/v1/list'>;
type Entry = Keytab['keytab'][number];

/** Whether an encryption type is no longer safe: DES, triple DES and RC4 (RFC 6649, RFC 8429). */
export const isWeak = (type: string) => /^(deprecated:)?(des|arcfour|rc4)/i.test(type);

function Entries({ entries }: { entries: Entry[] }) {
  if (entries.length === 0) return <Content component="p">{i18n._('No keytab is installed yet.')}</Content>;
  return (
    <Table aria-label={i18n._('Keys of the keytab')} variant="compact" gridBreakPoint="grid-md">
      <Thead>
        <Tr>
          <Th>{i18n._('Principal')}</Th>
          <Th>{i18n._('Key version')}</Th>
          <Th>{i18n._('Encryption')}</Th>
        </Tr>
      </Thead>
      <Tbody>
        {entries.map((entry, index) => (
          <Tr key={index}>
            <Td dataLabel={i18n._('Principal')}>{entry.kerberos_principal}</Td>
            <Td dataLabel={i18n._('Key version')}>{entry.version}</Td>
            <Td dataLabel={i18n._('Encryption')}>
              {entry.enc_type} {isWeak(entry.enc_type) && <Label color="orange">{i18n._('weak')}</Label>}
            </Td>
          </Tr>
        ))}
      </Tbody>
    </Table>
  );
}

/** Whether clients, which ask for nfs/NAME, find a key for the name of the box. */
function HostFit() {
  const check = useRead('VORN.Core.FileServ.NFS.Health/v1/check', { kind: 'missing_host_key' });
  return (
    <Loaded query={check}>
      {({ data: { findings, not_checked: gaps } }) => (
        <>
          {findings.map((finding) => (
            <FindingAlert key={finding.text} finding={finding} />
          ))}
          {gaps.map((gap) => (
            <Alert key={gap.reason} variant="info" isInline component="h3" title={i18n._('The name cannot be checked')}>
              <Content component="p" lang="en">
                {gap.reason}
              </Content>
            </Alert>
          ))}
          {findings.length + gaps.length === 0 && (
            <Content component="p">{i18n._('The keytab has a key for the name of the box.')}</Content>
          )}
        </>
      )}
    </Loaded>
  );
}

/** The principals of a keytab, each with its key versions. */
function describe({ keytab }: Keytab): string {
  const names = keytab.map((entry) => `${entry.kerberos_principal} (${entry.version})`);
  return [...new Set(names)].join(', ') || i18n._('none');
}

/** The form with the file, as the method takes it. */
function formOf(file: File) {
  const form = new FormData();
  form.append('keytab_file', file);
  return form;
}

function Upload({ tag }: { tag: string | null }) {
  const [file, setFile] = useState<File | null>(null);
  const forget = () => {
    setFile(null);
  };
  return (
    <Form
      onSubmit={(event) => {
        event.preventDefault(); // the choice of a file begins the installation
      }}
    >
      <FormGroup label={i18n._('Install a keytab')} fieldId="keytab-filename">
        <FileField
          id="keytab"
          hideDefaultPreview
          filename={file?.name ?? ''}
          filenamePlaceholder={i18n._('Drag a keytab here, or choose it')}
          clearButtonText={i18n._('Remove')}
          filenameAriaLabel={i18n._('Keytab file')}
          onChoose={setFile}
          onClear={forget}
        />
        <FormHelperText>
          <HelperText>
            <HelperTextItem>
              {i18n._('The Kerberos server makes it. What installing it does is shown first.')}{' '}
              <code>{'kadmin ktadd -k nfs.keytab nfs/box.example'}</code>
            </HelperTextItem>
          </HelperText>
        </FormHelperText>
      </FormGroup>
      {file && (
        <ChangeDialog
          title={i18n._('What installing {name} does', { name: file.name })}
          confirm={i18n._('Install')}
          done={i18n._('The keytab is installed')}
          change={{
            method: 'VORN.Core.FileServ.NFS.Kerberos/v1/upload_key',
            parameters: {},
            tag,
            form: formOf(file),
          }}
          decision={{
            mine: [{ label: i18n._('Keytab'), text: file.name }],
            describe: (stored) => [{ label: i18n._('Keytab'), text: describe(stored as Keytab) }],
            onTakeTheirs: forget,
          }}
          onDone={forget}
          onClose={forget}
        />
      )}
    </Form>
  );
}

export default function KerberosPage() {
  const status = useRead('VORN.Core.FileServ.NFS.Kerberos/v1/get', {});
  const keytab = useRead('VORN.Core.FileServ.NFS.Kerberos/v1/list', {});
  const mayWrite = useMayWrite();
  return (
    <PageFrame
      title={i18n._('Kerberos')}
      purpose={i18n._('The keytab with which the box proves to clients and users who it is.')}
    >
      <div className="stack">
        <ReadOnlyNotice />
        <Loaded query={status}>
          {({ data }) =>
            data.kerberos_support ? (
              <Loaded query={keytab}>
                {(answer) => (
                  <>
                    {answer.data.keytab.some((entry) => isWeak(entry.enc_type)) && (
                      <Alert variant="warning" isInline component="h2" title={i18n._('The keytab has weak keys')}>
                        {i18n._('Have the Kerberos server make keys for AES, and install the new keytab.')}
                      </Alert>
                    )}
                    <Content component="p">
                      {data.kerberos_principal
                        ? i18n._('The NFS service uses the principal {name}.', { name: data.kerberos_principal })
                        : i18n._('The NFS service has no principal yet.')}
                    </Content>
                    <section>
                      <Title headingLevel="h2">{i18n._('Installed keys')}</Title>
                      <Entries entries={answer.data.keytab} />
                    </section>
                    {answer.data.keytab.length > 0 && <HostFit />}
                    {mayWrite && <Upload tag={answer.tag} />}
                  </>
                )}
              </Loaded>
            ) : (
              <Alert
                variant="info"
                isInline
                component="h2"
                title={i18n._('This system does not support Kerberos for NFS.')}
              />
            )
          }
        </Loaded>
      </div>
    </PageFrame>
  );
}
