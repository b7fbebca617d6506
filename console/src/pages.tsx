import { lazy, Suspense, type ComponentType } from 'react';
import { i18n } from '@lingui/core';
import { EmptyState, PageSection, Skeleton } from '@patternfly/react-core';
import { partsOf, usePath } from './shared/router';

/** A page of the console: the first part of its address, its name in the navigation, and its code. */
interface Page {
  name: string;
  title: string;
  Component: ComponentType<{ rest: string[] }>;
}

export const pages: Page[] = [
  { name: '', title: /*i18n*/ 'Overview', Component: lazy(() => import('./pages/overview')) },
  { name: 'service', title: /*i18n*/ 'Service', Component: lazy(() => import('./pages/service')) },
  { name: 'shares', title: /*i18n*/ 'Shared folders', Component: lazy(() => import('./pages/shares')) },
  { name: 'clients', title: /*i18n*/ 'Clients', Component: lazy(() => import('./pages/clients')) },
  { name: 'access', title: /*i18n*/ 'Access check', Component: lazy(() => import('./pages/access')) },
  { name: 'idmap', title: /*i18n*/ 'ID mapping', Component: lazy(() => import('./pages/idmap')) },
  { name: 'kerberos', title: /*i18n*/ 'Kerberos', Component: lazy(() => import('./pages/kerberos')) },
  { name: 'advanced', title: /*i18n*/ 'Advanced', Component: lazy(() => import('./pages/advanced')) },
  { name: 'history', title: /*i18n*/ 'History', Component: lazy(() => import('./pages/history')) },
  { name: 'people', title: /*i18n*/ 'People and tokens', Component: lazy(() => import('./pages/people')) },
];

/** The page at the address. */
export function Pages() {
  const [name = '', ...rest] = partsOf(usePath());
  const page = pages.find((each) => each.name === name);
  if (!page) {
    return (
      <EmptyState titleText={i18n._('There is no such page')} headingLevel="h1">
        <a href="#/">{i18n._('Go to the overview')}</a>
      </EmptyState>
    );
  }
  const loading = (
    <PageSection>
      <Skeleton height="8rem" screenreaderText={i18n._('Loading')} />
    </PageSection>
  );
  return (
    <Suspense key={name} fallback={loading}>
      <page.Component rest={rest} />
    </Suspense>
  );
}
