import js from '@eslint/js';
import globals from 'globals';
import tseslint from 'typescript-eslint';
import hooks from 'eslint-plugin-react-hooks';
import a11y from 'eslint-plugin-jsx-a11y';

const TEXT_ATTRIBUTES =
  '/^(aria-label|aria-description|label|title|titleText|placeholder|alt|content|bodyContent|text|helperText|description)$/';

export default tseslint.config(
  { ignores: ['dist', 'build', 'src/api/schema.d.ts'] },
  js.configs.recommended,
  {
    files: ['**/*.{ts,tsx}'],
    extends: [...tseslint.configs.strictTypeChecked],
    languageOptions: { parserOptions: { projectService: true, tsconfigRootDir: import.meta.dirname } },
    rules: {
      '@typescript-eslint/restrict-template-expressions': ['error', { allowNumber: true }],
    },
  },
  {
    files: ['src/**/*.{ts,tsx}'], // not e2e: Playwright's fixture argument `use` looks like a hook of React
    extends: [a11y.flatConfigs.recommended, hooks.configs.flat.recommended],
    rules: {
      'react-hooks/incompatible-library': 'off', // useVirtualizer; the React compiler is not used
      'no-restricted-syntax': [
        'error',
        { selector: 'JSXText[value=/[A-Za-z]{2,}/]', message: 'Texts belong into the catalogue: i18n._(...).' },
        {
          selector: `JSXAttribute[name.name=${TEXT_ATTRIBUTES}] > Literal[value=/[A-Za-z]{2,}/]`,
          message: 'Texts belong into the catalogue: i18n._(...).',
        },
      ],
    },
  },
  { files: ['public/*.js'], languageOptions: { globals: globals.browser, sourceType: 'script' } },
);
