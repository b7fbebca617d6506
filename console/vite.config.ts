import { defineConfig, type Plugin } from 'vitest/config';
import type { CSSOptions } from 'vite';
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

const OTHER_THEME = /\.pf-v6-theme-(?!dark\b)/;

/** Removes the rules of PatternFly's themes other than the light and the dark one, which theme.js chooses from. */
const withoutOtherThemes: CSSOptions['postcss'] = {
  plugins: [
    {
      postcssPlugin: 'patternfly-without-other-themes',
      Rule: (rule) => {
        rule.selectors = rule.selectors.filter((text) => !OTHER_THEME.test(text.replace(/:not\([^()]*\)/g, '')));
        if (!rule.selector) rule.remove();
      },
    },
  ],
};

/**
 * Removes the plain texts from the compiled catalogue of the source language: their keys are the texts. Texts with
 * values stay, which the page cannot compile.
 */
const withoutPlainTexts = (): Plugin => ({
  name: 'source-catalogue-without-plain-texts',
  transform: {
    filter: { id: /locales[\\/]en\.po$/ },
    handler: (code) => {
      const literal = /JSON\.parse\((.*)\)/s.exec(code)?.[1];
      if (!literal) throw new Error('the compiled catalogue has another form');
      const messages = JSON.parse(JSON.parse(literal) as string) as Record<string, unknown[]>;
      const needed = Object.entries(messages).filter(([key, text]) => text.length !== 1 || text[0] !== key);
      return `export const messages = JSON.parse(${JSON.stringify(JSON.stringify(Object.fromEntries(needed)))});`;
    },
  },
});

export default defineConfig({
  plugins: [withoutFonts(), react(), lingui({ failOnMissing: true }), withoutPlainTexts()],
  css: { postcss: withoutOtherThemes },
  build: {
    target: 'es2022',
    assetsInlineLimit: 0, // a data: address would need a weaker content policy
    modulePreload: { polyfill: false },
  },
  test: { environment: 'jsdom', setupFiles: 'tests/setup.ts', include: ['tests/**/*.test.{ts,tsx}'] },
});
