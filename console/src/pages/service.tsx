import { i18n } from '@lingui/core';
import type { Answer, Data } from '../api/call';
import type { Fact } from '../shared/conflict';
import { SwitchField, TextField } from '../shared/fields';
import { Loaded, PageFrame } from '../shared/page';
import { SettingsForm } from '../shared/settings-form';
import { TransferSizeField } from '../shared/transfer-size';
import { useDraft } from '../shared/use-draft';
import { useRead } from '../shared/use-read';
import { transferSize, yesNo } from '../shared/words';

type Settings = Data<'VORN.Core.FileServ.NFS/v1/get'>;

const describe = (settings: Settings): Fact[] => [
  { label: i18n._('NFS service'), text: yesNo(settings.enable_nfs) },
  { label: i18n._('NFSv4'), text: yesNo(settings.enable_nfs_v4) },
  { label: i18n._('NFSv4 domain'), text: settings.nfs_v4_domain },
  { label: i18n._('Largest read transfer'), text: transferSize(settings.read_size) },
  { label: i18n._('Largest write transfer'), text: transferSize(settings.write_size) },
  { label: i18n._('Look up groups on this box'), text: yesNo(settings.unix_pri_enable) },
];

function ServiceForm({ answer }: { answer: Answer<Settings> }) {
  const draft = useDraft(answer.data, answer.tag);
  const { value, change } = draft;
  return (
    <SettingsForm
      draft={draft}
      method="VORN.Core.FileServ.NFS/v1/set"
      parameters={value}
      mine={describe(value)}
      describe={(stored) => describe(stored as Settings)}
      isValid
    >
      <SwitchField
        label={i18n._('NFS service')}
        help={i18n._('While the service is off, no client can use a shared folder over NFS.')}
        value={value.enable_nfs}
        onChange={(on) => {
          change({ enable_nfs: on });
        }}
      />
      <SwitchField
        label={i18n._('NFSv4')}
        help={i18n._('Clients may use NFSv4 besides NFSv3. Kerberos and ID mapping are mostly used with it.')}
        value={value.enable_nfs_v4}
        onChange={(on) => {
          change({ enable_nfs_v4: on });
        }}
      />
      <TextField
        label={i18n._('NFSv4 domain')}
        help={i18n._(
          'The part behind the @ of user names. It must be the same on the clients; otherwise all files seem to belong to nobody.',
        )}
        value={value.nfs_v4_domain}
        isDisabled={!value.enable_nfs_v4}
        onChange={(text) => {
          change({ nfs_v4_domain: text });
        }}
      />
      <TransferSizeField
        label={i18n._('Largest read transfer')}
        value={value.read_size}
        onChange={(size) => {
          change({ read_size: size });
        }}
      />
      <TransferSizeField
        label={i18n._('Largest write transfer')}
        help={i18n._('The system chooses well. Another size takes effect when the service is started the next time.')}
        value={value.write_size}
        onChange={(size) => {
          change({ write_size: size });
        }}
      />
      <SwitchField
        label={i18n._('Look up groups on this box')}
        help={i18n._(
          'The box uses its own list of the groups of a user. Otherwise it believes the client, which can name 16 groups at most.',
        )}
        value={value.unix_pri_enable}
        onChange={(on) => {
          change({ unix_pri_enable: on });
        }}
      />
    </SettingsForm>
  );
}

export default function ServicePage() {
  const settings = useRead('VORN.Core.FileServ.NFS/v1/get', {});
  return (
    <PageFrame title={i18n._('Service')} purpose={i18n._('Switches NFS on and off, and sets how clients talk to it.')}>
      <Loaded query={settings}>{(answer) => <ServiceForm answer={answer} />}</Loaded>
    </PageFrame>
  );
}
