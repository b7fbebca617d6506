import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Breadcrumb, BreadcrumbItem, Button, Content, EmptyState } from '@patternfly/react-core';
import type { Answer, Data } from '../../api/call';
import { useMayWrite } from '../../session/session';
import { addedLines } from '../../shared/difference';
import { Loaded, PageFrame } from '../../shared/page';
import { usePreview } from '../../shared/preview';
import { Problem } from '../../shared/problem';
import { linkTo } from '../../shared/router';
import { SettingsForm } from '../../shared/settings-form';
import { useDraft } from '../../shared/use-draft';
import { useRead } from '../../shared/use-read';
import { describe, newRule, toParameters, type StoredRule } from './rule';
import { RuleForm } from './rule-form';
import { MountCommands, RuleTable } from './rule-table';

const SAVE = 'VORN.Core.FileServ.NFS.SharePrivilege/v1/save';

type Stored = Data<'VORN.Core.FileServ.NFS.SharePrivilege/v1/load'>;

/** The line that exports(5) will have, or why there is none. */
function ExportsLine({ preview }: { preview: ReturnType<typeof usePreview> }) {
  if (preview.error) return <Problem error={preview.error} title={i18n._('These rules cannot be saved')} />;
  const lines = preview.data?.rehearsal?.files.flatMap((file) => addedLines(file.difference)) ?? [];
  if (lines.length === 0) return null;
  return (
    <section aria-live="polite">
      <Content component="h2">{i18n._('What the file exports(5) gets')}</Content>
      {/* A region that scrolls must be reachable by keyboard. */}
      {/* eslint-disable-next-line jsx-a11y/no-noninteractive-tabindex */}
      <pre className="exports" tabIndex={0} role="region" aria-label={i18n._('Lines of exports(5)')}>
        {lines.join('\n')}
      </pre>
    </section>
  );
}

function move(rules: StoredRule[], from: number, to: number): StoredRule[] {
  const rule = rules[from];
  return rule ? rules.toSpliced(from, 1).toSpliced(to, 0, rule) : rules;
}

/** The rule that is being edited: its place, and the rule before the edit. */
interface Edit {
  index: number;
  rule: StoredRule;
  isNew: boolean;
}

function Rules({
  name,
  path,
  answer,
  kerberos,
}: {
  name: string;
  path: string;
  answer: Answer<Stored>;
  kerberos: boolean;
}) {
  const draft = useDraft(answer.data.rule, answer.tag);
  const [edit, setEdit] = useState<Edit | null>(null);
  const mayWrite = useMayWrite();
  const rules = draft.value;
  const rule = toParameters(rules);
  const parameters = { share_name: name, rule: rule ?? [] };
  const preview = usePreview(draft.dirty && rule ? { method: SAVE, parameters, tag: draft.tag } : null);
  const close = () => {
    setEdit(null);
  };
  const add = (added: StoredRule) => {
    setEdit({ index: rules.length, rule: added, isNew: true });
  };
  return (
    <>
      <SettingsForm
        draft={draft}
        method={SAVE}
        parameters={parameters}
        mine={describe(rules)}
        describe={(stored) => describe((stored as Stored).rule)}
        isValid={rule !== null}
        isWide
      >
        {rules.length === 0 ? (
          <EmptyState headingLevel="h2" titleText={i18n._('Nobody may mount this folder')}>
            {i18n._('Add a rule for a client, and the client may mount it.')}
          </EmptyState>
        ) : (
          <RuleTable
            rules={rules}
            actions={{
              onEdit: (index) => {
                const edited = rules[index];
                if (edited) setEdit({ index, rule: edited, isNew: false });
              },
              onCopy: (index) => {
                const copied = rules[index];
                if (copied) add({ ...copied });
              },
              onMove: (index, to) => {
                draft.set(move(rules, index, to));
              },
              onDelete: (index) => {
                draft.set(rules.toSpliced(index, 1));
              },
            }}
          />
        )}
        {mayWrite && (
          <div>
            <Button
              variant="secondary"
              onClick={() => {
                add(newRule(kerberos));
              }}
            >
              {i18n._('Add a rule')}
            </Button>
          </div>
        )}
        {draft.dirty && rule && <ExportsLine preview={preview} />}
        <MountCommands rules={rules} path={path} name={name} />
        <p>
          <a href={linkTo('access', name)}>{i18n._('Who can get in, and why can a client not mount it?')}</a>
        </p>
      </SettingsForm>
      {edit && (
        <RuleForm
          {...edit}
          clients={edit.isNew ? [...rules.map((each) => each.client), ''] : rules.map((each) => each.client)}
          onDone={(done) => {
            draft.set(edit.isNew ? [...rules, done] : rules.with(edit.index, done));
            close();
          }}
          onClose={close}
        />
      )}
    </>
  );
}

/** One shared folder: its rules, and how clients mount it. */
export function SharePage({ name }: { name: string }) {
  const share = useRead('VORN.Core.Share/v1/get', { name });
  const rules = useRead('VORN.Core.FileServ.NFS.SharePrivilege/v1/load', { share_name: name });
  const kerberos = useRead('VORN.Core.FileServ.NFS.Kerberos/v1/get', {});
  return (
    <PageFrame
      title={name}
      purpose={
        share.data
          ? i18n._('Who may mount {path}, and how.', { path: share.data.data.path })
          : i18n._('Who may mount the folder, and how.')
      }
      above={
        <Breadcrumb aria-label={i18n._('Path to this page')}>
          <BreadcrumbItem to="#/shares">{i18n._('Shared folders')}</BreadcrumbItem>
          <BreadcrumbItem isActive>{name}</BreadcrumbItem>
        </Breadcrumb>
      }
    >
      <Loaded query={share}>
        {({ data }) => (
          <Loaded query={rules}>
            {(answer) => (
              <Loaded query={kerberos}>
                {(status) => (
                  <Rules name={name} path={data.path} answer={answer} kerberos={status.data.kerberos_support} />
                )}
              </Loaded>
            )}
          </Loaded>
        )}
      </Loaded>
    </PageFrame>
  );
}
