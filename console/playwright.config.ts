import { defineConfig } from '@playwright/test';

const views = [
  ['wide-light', 1280, 800, 'light'],
  ['wide-dark', 1280, 800, 'dark'],
  ['small-light', 390, 844, 'light'],
  ['small-dark', 390, 844, 'dark'],
] as const;

export default defineConfig({
  testDir: 'e2e',
  outputDir: '../build/console/test-results',
  fullyParallel: true,
  workers: 2,
  retries: 0,
  timeout: 400_000,
  forbidOnly: Boolean(process.env.CI),
  reporter: [['list']],
  expect: { timeout: 60_000 },
  use: {
    locale: 'en-GB',
    timezoneId: 'UTC',
    contextOptions: { reducedMotion: 'reduce' },
    trace: 'retain-on-failure',
    launchOptions: {
      executablePath: process.env.CHROMIUM ?? '/usr/bin/chromium',
      args: ['--font-render-hinting=none', '--disable-lcd-text'],
    },
  },
  // The flows run in one view; what every page looks like is tested in all of them.
  projects: views.map(([name, width, height, colorScheme]) => ({
    name,
    use: { viewport: { width, height }, colorScheme },
    ...(name === 'wide-light' ? {} : { grep: /@view/ }),
  })),
});
