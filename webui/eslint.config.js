import js from '@eslint/js';
import hooks from 'eslint-plugin-react-hooks';
import globals from 'globals';
import ts from 'typescript-eslint';

export default ts.config(
    { ignores: ['dist/', 'node_modules/', 'test-results/'] },
    js.configs.recommended,
    ...ts.configs.strict,
    {
        files: ['src/**/*.{ts,tsx}'],
        plugins: { 'react-hooks': hooks },
        languageOptions: { globals: globals.browser },
        rules: {
            'react-hooks/rules-of-hooks': 'error',
            'react-hooks/exhaustive-deps': 'error',
            'max-lines': ['error', { max: 300, skipBlankLines: true, skipComments: true }],
            eqeqeq: 'error',
        },
    },
    { files: ['scripts/**', '*.{js,ts}', 'tests/**'], languageOptions: { globals: globals.node } },
);
