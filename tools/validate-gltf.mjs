#!/usr/bin/env node
// Checks glTF files (.gltf with embedded or side-car buffers, or .glb) with the Khronos
// validator. Usage: node tools/validate-gltf.mjs [--json] FILE...
// Prints one summary line per file (errors, warnings, infos, hints) and the messages of the
// first 20 errors and warnings; exits with 1 when any file has errors or cannot be read, 2 on bad usage.
import { createRequire } from 'node:module';
import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath } from 'node:url';

const require = createRequire(import.meta.url);
const here = path.dirname(fileURLToPath(import.meta.url));
const validator = require(path.join(here, 'node_modules', 'gltf-validator'));

const args = process.argv.slice(2);
const asJson = args[0] === '--json';
const files = asJson ? args.slice(1) : args;
if (files.length === 0) {
    console.error('usage: node tools/validate-gltf.mjs [--json] FILE...');
    process.exit(2);
}

async function validateFile(file) {
    const bytes = new Uint8Array(await readFile(file));
    const dir = path.dirname(file);
    return validator.validateBytes(bytes, {
        uri: path.basename(file),
        maxIssues: 200,
        // Side-car buffers and images are read relative to the file being checked.
        externalResourceFunction: (uri) =>
            readFile(path.resolve(dir, decodeURIComponent(uri))).then(
                (data) => new Uint8Array(data),
                (err) => Promise.reject(err.message)),
    });
}

let failed = false;
for (const file of files) {
    try {
        const report = await validateFile(file);
        const i = report.issues;
        if (asJson) {
            console.log(JSON.stringify(report, null, 2));
        }
        console.log(`${file}: ${i.numErrors} errors, ${i.numWarnings} warnings, ` +
                    `${i.numInfos} infos, ${i.numHints} hints`);
        const shown = i.messages.filter((m) => m.severity <= 1);
        if (shown.length > 20) {
            console.log(`  (the first 20 of ${shown.length} errors and warnings)`);
        }
        for (const m of shown.slice(0, 20)) {
            {
                const kind = m.severity === 0 ? 'error' : 'warning';
                console.log(`  ${kind} ${m.code} at ${m.pointer ?? m.offset ?? ''}: ${m.message}`);
            }
        }
        failed = failed || i.numErrors > 0;
    } catch (err) {
        console.log(`${file}: cannot be validated: ${err?.message ?? err}`);
        failed = true;
    }
}
process.exit(failed ? 1 : 0);
