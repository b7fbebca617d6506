import { i18n } from '@lingui/core';
import { PageFrame, ReadOnlyNotice } from '../shared/page';
import { useMayWrite } from '../session/session';
import { Sessions } from './people/sessions';
import { Tokens } from './people/tokens';

export default function PeoplePage() {
  const mayWrite = useMayWrite();
  return (
    <PageFrame
      title={i18n._('People and tokens')}
      purpose={i18n._('Who has signed in, and the programs that may call the box.')}
    >
      <div className="stack">
        <ReadOnlyNotice />
        {mayWrite && <Sessions />}
        {mayWrite && <Tokens />}
      </div>
    </PageFrame>
  );
}
