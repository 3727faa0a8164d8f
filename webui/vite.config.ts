import react from '@vitejs/plugin-react';
import { defineConfig } from 'vitest/config';

// Where `npm run dev` finds the web API; the built page is served by the web-API server itself.
const server = process.env['ORVA_SERVER'] ?? 'http://127.0.0.1:5080';
const api = { target: server, changeOrigin: false };

export default defineConfig({
    plugins: [react()],
    base: './',
    build: {
        target: 'es2023',
        // The server's Content-Security-Policy knows no data: addresses.
        assetsInlineLimit: 0,
        modulePreload: { polyfill: false },
        reportCompressedSize: false,
        chunkSizeWarningLimit: 900,
    },
    server: { proxy: { '/webapi': api, '/session': api } },
    test: { include: ['src/**/*.test.ts'], environment: 'node' },
});
