import { vi } from 'vitest';
import { i18n } from '@lingui/core';
import '../src/locale';
import { messages } from '../src/locales/en.po';

// jsdom has neither.
vi.stubGlobal('matchMedia', () => ({ matches: false, addEventListener: () => {}, removeEventListener: () => {} }));
vi.stubGlobal(
  'ResizeObserver',
  class {
    observe() {}
    disconnect() {}
    unobserve() {}
  },
);
i18n.loadAndActivate({ locale: 'en', messages });
