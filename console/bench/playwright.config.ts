import { defineConfig } from '@playwright/test';
import flows from '../playwright.config';

/** Measures the page in one window, one measurement after the other; bench/console prints the results. */
export default defineConfig({
  ...flows,
  testDir: '.',
  outputDir: '../../build/console/bench-results',
  workers: 1,
  timeout: 600_000,
  use: { ...flows.use, trace: 'off' },
  projects: [{ name: 'bench', use: { viewport: { width: 1280, height: 800 } } }],
});
