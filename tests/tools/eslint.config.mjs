// The tools live below build/, so that the tree holds no third-party code.
import { createRequire } from "node:module";
import { join } from "node:path";

const require = createRequire(join(process.cwd(), "build/node/"));
const js = require("@eslint/js");
const globals = require("globals");

export default [
  js.configs.recommended,
  {
    languageOptions: { globals: globals.browser },
    rules: {
      eqeqeq: "error",
      "max-len": ["error", { code: 100 }],
      "no-shadow": "error",
      "no-unused-vars": "error",
      "no-var": "error",
      "prefer-const": "error",
    },
  },
];
