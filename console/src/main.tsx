import '@patternfly/react-core/dist/styles/base.css';
import './console.css';
import { StrictMode } from 'react';
import { createRoot } from 'react-dom/client';
import { QueryClient, QueryClientProvider } from '@tanstack/react-query';
import { i18n } from '@lingui/core';
import { I18nProvider } from '@lingui/react';
import { App } from './app';
import { activatePreferred } from './locale';

// A call that fails is shown at once; only the box itself can tell when another attempt is useful.
const client = new QueryClient({
  defaultOptions: {
    queries: { retry: false, staleTime: 5000, networkMode: 'always' },
    mutations: { networkMode: 'always' },
  },
});

async function start(root: HTMLElement) {
  await activatePreferred();
  createRoot(root).render(
    <StrictMode>
      <QueryClientProvider client={client}>
        <I18nProvider i18n={i18n}>
          <App />
        </I18nProvider>
      </QueryClientProvider>
    </StrictMode>,
  );
}

const root = document.getElementById('root');
if (root) void start(root);
