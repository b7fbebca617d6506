import { defineConfig, type Plugin } from 'vitest/config';
import react from '@vitejs/plugin-react';
import { lingui } from '@lingui/vite-plugin';

/** Removes the fonts and background pictures of PatternFly's style sheets: the page uses the system's fonts. */
const withoutFonts = (): Plugin => ({
  name: 'patternfly-without-fonts',
  enforce: 'pre',
  transform: {
    filter: { id: /@patternfly[\\/].*\.css$/ },
    handler: (code) =>
      code.replace(/@font-face\s*\{[^}]*\}/g, '').replace(/url\((['"]?)[^)'"]*\.(?:svg|jpg|png)\1\)/g, 'none'),
  },
});

export default defineConfig({
  plugins: [withoutFonts(), react(), lingui({ failOnMissing: true })],
  build: {
    target: 'es2022',
    assetsInlineLimit: 0, // a data: address would need a weaker content policy
    modulePreload: { polyfill: false },
  },
  test: { environment: 'jsdom', setupFiles: 'tests/setup.ts', include: ['tests/**/*.test.{ts,tsx}'] },
});
