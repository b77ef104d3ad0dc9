import { defineConfig } from 'vitest/config';

// "npm run dev" shows the page while it is written, with the calls of a server that runs elsewhere (VORN_SERVER).
const server = process.env['VORN_SERVER'] ?? 'http://127.0.0.1:8080';

export default defineConfig({
  base: './',
  build: {
    target: ['chrome123', 'firefox120', 'safari17.5'],
    assetsInlineLimit: 0, // the content security policy lets nothing inline in
    modulePreload: { polyfill: false },
    chunkSizeWarningLimit: 400,
  },
  server: { proxy: { '/webapi': { target: server } } },
  test: { include: ['test/**/*.test.ts'], environment: 'node' },
});
