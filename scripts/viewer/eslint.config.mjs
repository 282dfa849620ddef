// Rules for the scripts in program/page/viewer/, which are joined in one element: each declares one constant.
import js from "@eslint/js";

const readonly = names => Object.fromEntries(names.map(name => [name, "readonly"]));

export default [
    { ignores: ["three.min.js", "**/*.mjs", "node_modules/"] },
    js.configs.recommended,
    {
        files: ["*.js"],
        languageOptions: {
            sourceType: "script",
            globals: readonly(["THREE", "Colors", "Data", "Shaders", "Scenes", "Cameras", "Charts", "Views",
                "document", "window", "atob", "requestAnimationFrame", "ResizeObserver", "setTimeout"]),
        },
        rules: {
            "no-redeclare": ["error", { builtinGlobals: false }],
            "no-unused-vars": ["error", { varsIgnorePattern: "^(Colors|Data|Shaders|Scenes|Cameras|Charts|Views)$" }],
            "prefer-const": "error",
            eqeqeq: "error",
            "no-var": "error",
            "no-implied-eval": "error",
            "no-restricted-properties": ["error", { property: "innerHTML", message: "names in files are not HTML" }],
        },
    },
];
