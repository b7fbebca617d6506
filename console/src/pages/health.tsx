// The findings of the health check, each with its remedy.
import { useState } from 'react';
import { i18n } from '@lingui/core';
import { Button, Content, ExpandableSection, List, ListItem } from '@patternfly/react-core';
import type { Data, Method } from '../api/call';
import { useMayWrite } from '../session/session';
import { ChangeDialog, type Change } from '../shared/change-dialog';
import { FindingAlert } from '../shared/finding';
import { Loaded } from '../shared/page';
import { useRead } from '../shared/use-read';

type Answer = Data<'VORN.Core.FileServ.NFS.Health/v1/check'>;
type Finding = Answer['findings'][number];
type Call = NonNullable<Finding['call']>;

/**
 * The call of a remedy. The server names the method, so its parameters have no type here, and no answer with an entity
 * tag was read for it: the dialog rehearses the call on the data of that moment.
 */
const changeOf = ({ api, version, method, parameters }: Call): Change<Method> => ({
  method: `${api}/v${version}/${method}` as Method,
  parameters,
  tag: null,
});

/** Leads to the call that carries out the remedy, with its rehearsal first. */
function RemedyButton({ finding, onRemedy }: { finding: Finding; onRemedy: (finding: Finding) => void }) {
  if (!useMayWrite() || !finding.call) return null;
  return (
    <Button
      variant="link"
      isInline
      onClick={() => {
        onRemedy(finding);
      }}
    >
      {i18n._('Look at the remedy')}
    </Button>
  );
}

function Gaps({ gaps }: { gaps: Answer['not_checked'] }) {
  if (gaps.length === 0) return null;
  return (
    <ExpandableSection
      toggleText={i18n._('{n, plural, one {# check could not be made} other {# checks could not be made}}', {
        n: gaps.length,
      })}
    >
      <List lang="en">
        {gaps.map((gap) => (
          <ListItem key={`${gap.kind} ${gap.reason}`}>{gap.reason}</ListItem>
        ))}
      </List>
    </ExpandableSection>
  );
}

/** All findings, the most important ones first. */
export function Health() {
  const health = useRead('VORN.Core.FileServ.NFS.Health/v1/check', {});
  const [remedied, setRemedied] = useState<Finding | null>(null);
  const close = () => {
    setRemedied(null);
  };
  return (
    <div className="stack">
      <Loaded query={health}>
        {({ data }) => (
          <>
            {data.findings.length === 0 && <Content component="p">{i18n._('Nothing wrong was found.')}</Content>}
            {data.findings.map((finding) => (
              <FindingAlert
                key={`${finding.kind} ${JSON.stringify(finding.subject)} ${finding.text}`}
                finding={finding}
                actions={finding.call && <RemedyButton finding={finding} onRemedy={setRemedied} />}
              />
            ))}
            <Gaps gaps={data.not_checked} />
          </>
        )}
      </Loaded>
      {remedied?.call && (
        <ChangeDialog
          title={i18n._('What the remedy does')}
          confirm={i18n._('Carry it out')}
          done={i18n._('The remedy was carried out')}
          change={changeOf(remedied.call)}
          onDone={close}
          onClose={close}
        >
          <Content component="p" lang="en">
            {remedied.remedy}
          </Content>
        </ChangeDialog>
      )}
    </div>
  );
}
