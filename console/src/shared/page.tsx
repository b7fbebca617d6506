import type { ReactNode } from 'react';
import type { UseQueryResult } from '@tanstack/react-query';
import { i18n } from '@lingui/core';
import { Alert, Button, Content, PageSection, Skeleton, Title } from '@patternfly/react-core';
import { useMayWrite } from '../session/session';
import { Problem } from './problem';

/** The frame of a page: what it is for, and its content. */
export function PageFrame({
  title,
  purpose,
  above,
  children,
}: {
  title: string;
  purpose: string;
  /** What stands above the title. */
  above?: ReactNode;
  children: ReactNode;
}) {
  return (
    <>
      <title>{`${title} · ${i18n._('Storage console')}`}</title>
      <PageSection>
        {above}
        <div className="page-head">
          <Title headingLevel="h1">{title}</Title>
        </div>
        <Content component="p">{purpose}</Content>
      </PageSection>
      <PageSection isFilled>{children}</PageSection>
    </>
  );
}

/** Why the controls of a page are switched off. */
export function ReadOnlyNotice() {
  if (useMayWrite()) return null;
  return (
    <Alert variant="info" isInline component="h2" title={i18n._('You may look, but not change anything')}>
      {i18n._('Your account or token has the role of a reader. An administrator of the box can change that.')}
    </Alert>
  );
}

/** Shows data when it is there, and before that what keeps it. */
export function Loaded<T>({ query, children }: { query: UseQueryResult<T>; children: (data: T) => ReactNode }) {
  if (query.data !== undefined) return children(query.data);
  if (query.error) {
    return (
      <>
        <Problem error={query.error} />
        <Button variant="secondary" onClick={() => void query.refetch()}>
          {i18n._('Try again')}
        </Button>
      </>
    );
  }
  return <Skeleton height="8rem" screenreaderText={i18n._('Loading')} />;
}
