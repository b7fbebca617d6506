// lint.mjs FILE: checks an OpenAPI document with all recommended rules and some more. Exit status 1 after any problem, also
// a warning.
import { createConfig, formatProblems, getTotals, lint } from '@redocly/openapi-core';

const config = await createConfig({
  extends: ['recommended'],
  rules: {
    // Methods ignore parameters that they do not know.
    'no-invalid-media-type-examples': { severity: 'error', allowAdditionalProperties: true },
    'no-invalid-schema-examples': 'error',
    // The answers 404 and 405 belong to paths that the document does not have.
    'no-unused-components': 'off',
    'operation-description': 'error',
    'operation-tag-defined': 'error',
    'tag-description': 'error',
  },
});
const problems = await lint({ ref: process.argv[2], config });
formatProblems(problems, { totals: getTotals(problems), format: 'stylish', version: '' });
console.log(`lint: ${problems.length} problems`);
process.exitCode = problems.length === 0 ? 0 : 1;
