// node size.mjs FOLDER: how large the built page is for who loads it. Fails above the limit.
import { readdirSync, readFileSync, statSync } from 'node:fs';
import { join } from 'node:path';
import { gzipSync } from 'node:zlib';

const LIMIT = 100_000; // bytes, all files compressed
const folder = process.argv[2] ?? 'dist';
const files = readdirSync(folder, { recursive: true }).map((name) => join(folder, String(name)));
const size = files.filter((name) => statSync(name).isFile()).reduce((sum, name) => sum + gzipSync(readFileSync(name)).length, 0);
console.log(`the page is ${size} bytes compressed, of ${LIMIT}`);
if (size > LIMIT) process.exitCode = 1;
