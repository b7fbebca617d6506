import { i18n } from '@lingui/core';
import { Alert, Content } from '@patternfly/react-core';
import { Failure, type Answer, type Data } from '../api/call';
import type { Fact } from '../shared/conflict';
import { Difference } from '../shared/difference';
import { NumberField, SwitchField } from '../shared/fields';
import { Loaded, PageFrame } from '../shared/page';
import { usePreview } from '../shared/preview';
import { SettingsForm } from '../shared/settings-form';
import { useDraft } from '../shared/use-draft';
import { useRead } from '../shared/use-read';
import { yesNo } from '../shared/words';

type Stored = Data<'VORN.Core.FileServ.NFS.AdvancedSetting/v1/get'>;

const PORT_IN_USE = 2303;

const isInUse = ({ error }: { error: unknown }) => error instanceof Failure && error.code === PORT_IN_USE;

const describe = (settings: Stored): Fact[] => [
  { label: i18n._('Fixed ports'), text: yesNo(settings.custom_port_enable !== 0) },
  { label: i18n._('Port of the status daemon (statd)'), text: String(settings.statd_port) },
  { label: i18n._('Port of the lock manager (lockd)'), text: String(settings.nlm_port) },
];

/** Why a port cannot be used; undefined if it can. */
export function portFault(port: number, other: number): string | undefined {
  if (!(port >= 1 && port <= 65535)) return i18n._('Enter a number from 1 to 65535.');
  return port === other ? i18n._('Both daemons need a port of their own.') : undefined;
}

/** What the change would do to the firewall, or why the ports cannot be used. */
function Effect({ preview }: { preview: ReturnType<typeof usePreview> }) {
  if (isInUse(preview)) {
    return (
      <Alert variant="danger" isInline component="h2" title={i18n._('A port is in use by another service')}>
        <Content component="p">{i18n._('Choose a port that nothing else uses.')}</Content>
      </Alert>
    );
  }
  const file = preview.data?.rehearsal?.files.find(
    (each) => each.path.includes('nft') || each.path.includes('firewall'),
  );
  if (!file) return null;
  return (
    <section>
      <Content component="p">{i18n._('The firewall will open and close these ports:')}</Content>
      <Difference {...file} />
    </section>
  );
}

function AdvancedForm({ answer, enabled }: { answer: Answer<Stored>; enabled: boolean }) {
  const draft = useDraft(answer.data, answer.tag);
  const { value, change } = draft;
  const fixed = value.custom_port_enable !== 0;
  const faults = fixed
    ? [portFault(value.statd_port, value.nlm_port), portFault(value.nlm_port, value.statd_port)]
    : [undefined, undefined];
  const unused = i18n._('Not used: the system chooses a port.');
  const isValid = faults.every((fault) => !fault);
  // A call without "enable_nfs" would switch the service off.
  const parameters = { ...value, custom_port_enable: fixed, enable_nfs: enabled };
  const method = 'VORN.Core.FileServ.NFS.AdvancedSetting/v1/set' as const;
  const preview = usePreview(draft.dirty && isValid ? { method, parameters, tag: draft.tag } : null);
  // The server does not say which port it refuses: each is tried alone, while the system chooses the other one.
  const refused = fixed && isInUse(preview);
  const tryAlone = (other: { nlm_port: number } | { statd_port: number }) =>
    refused ? { method, parameters: { ...parameters, ...other }, tag: draft.tag } : null;
  const statd = usePreview(tryAlone({ nlm_port: 0 }));
  const lockd = usePreview(tryAlone({ statd_port: 0 }));
  const faultOf = (alone: typeof statd) =>
    refused && isInUse(alone) ? i18n._('Another service uses this port.') : undefined;
  return (
    <SettingsForm
      draft={draft}
      method={method}
      parameters={parameters}
      mine={describe(value)}
      describe={(stored) => describe(stored as Stored)}
      isValid={isValid}
    >
      <SwitchField
        label={i18n._('Fixed ports')}
        help={i18n._(
          'NFSv3 needs two more daemons. With fixed ports, a firewall between the box and its clients can let them through.',
        )}
        value={fixed}
        onChange={(on) => {
          change({ custom_port_enable: on ? 1 : 0 });
        }}
      />
      <NumberField
        label={i18n._('Port of the status daemon (statd)')}
        value={value.statd_port || NaN}
        error={faults[0] ?? faultOf(statd)}
        isDisabled={!fixed}
        help={fixed ? undefined : unused}
        onChange={(port) => {
          change({ statd_port: port });
        }}
      />
      <NumberField
        label={i18n._('Port of the lock manager (lockd)')}
        value={value.nlm_port || NaN}
        error={faults[1] ?? faultOf(lockd)}
        isDisabled={!fixed}
        help={fixed ? undefined : unused}
        onChange={(port) => {
          change({ nlm_port: port });
        }}
      />
      {draft.dirty && isValid && <Effect preview={preview} />}
    </SettingsForm>
  );
}

export default function AdvancedPage() {
  const settings = useRead('VORN.Core.FileServ.NFS.AdvancedSetting/v1/get', {});
  const service = useRead('VORN.Core.FileServ.NFS/v1/get', {});
  return (
    <PageFrame
      title={i18n._('Advanced')}
      purpose={i18n._('Ports of the daemons that NFSv3 needs besides the NFS service.')}
    >
      <Loaded query={settings}>
        {(answer) => (
          <Loaded query={service}>{({ data }) => <AdvancedForm answer={answer} enabled={data.enable_nfs} />}</Loaded>
        )}
      </Loaded>
    </PageFrame>
  );
}
