// SPDX-License-Identifier: Apache-2.0
//
// Builds the web client into dist/ and runs its tests, which live in ../test/client.

import { defineConfig } from "vitest/config";

export default defineConfig({
  // Relative, so that the client works below any path of any web server.
  base: "./",
  build: {
    target: "es2022",
    // The content security policy admits files of our own server only, no data: URLs.
    assetsInlineLimit: 0,
    modulePreload: { polyfill: false },
  },
  server: { proxy: { "/webapi": "http://127.0.0.1:8080" }, fs: { allow: [".", "../test/client"] } },
  test: {
    dir: "../test/client",
    include: ["**/*.test.ts"],
    // The tests stand outside the folder of node_modules and could not import "vitest" by name.
    globals: true,
    // For a busy machine.
    testTimeout: 20_000,
    setupFiles: ["../test/client/support/patience.ts"],
  },
});
