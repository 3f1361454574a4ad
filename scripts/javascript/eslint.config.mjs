// What ESLint holds the JavaScript sources to: its own recommended rules, by where a file runs.
import js from "@eslint/js";
import globals from "globals";

export default [
  js.configs.recommended,
  {
    languageOptions: { ecmaVersion: 2022, sourceType: "module" },
    linterOptions: { reportUnusedDisableDirectives: "error" },
    rules: {
      eqeqeq: ["error", "always", { null: "ignore" }],
      "no-implied-eval": "error",
      "no-shadow": "error",
      "no-throw-literal": "error",
      "no-unused-vars": ["error", { argsIgnorePattern: "^_", caughtErrors: "all" }],
      "no-var": "error",
      "prefer-const": "error",
    },
  },
  { files: ["web/**"], languageOptions: { globals: globals.browser } },
  {
    files: ["bindings/wasm/**"],
    languageOptions: { globals: { ...globals.browser, ...globals.worker, process: "readonly" } },
  },
  {
    // What these hand to a browser to run sees the browser's names too.
    files: ["tests/**", "bench/**", "bindings/wasm/example/**"],
    languageOptions: { globals: { ...globals.node, ...globals.browser } },
  },
];
