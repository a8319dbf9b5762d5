// Pages of what stands in the build tree, in a browser.
import assert from 'node:assert/strict';
import {spawnSync} from 'node:child_process';
import {mkdtempSync, readFileSync, rmSync, writeFileSync} from 'node:fs';
import {tmpdir} from 'node:os';
import {join} from 'node:path';
import {after} from 'node:test';
import {browser} from './chromium.js';

export {closePage, openPage} from './chromium.js';

export const build = process.env.BUILD;
export const scratch = mkdtempSync(join(tmpdir(), 'page-'));

after(async () => {
  await browser.close();
  rmSync(scratch, {recursive: true});
});

// Of a file that there is not yet.
function scratchName(ending) {
  return join(scratch, `${Math.random().toString(36).slice(2)}${ending}`);
}

function run(words, expected) {
  const {status, stdout, stderr} = spawnSync(join(build, 'ksicache'), words, {encoding: 'utf8', maxBuffer: 1 << 28});
  assert.equal(status, expected, stderr);
  return stdout;
}

export function ksicache(...words) {
  return run(words, 0);
}

// The same where something is left out, which is told.
export function ksicachePartly(...words) {
  return run(words, 1);
}

// A recording as if something else had happened: see reshape.cc.
export function reshaped(recording, ...changes) {
  const name = scratchName('.rec');
  const {status, stderr} = spawnSync(join(build, 'tests/page/reshape'), [recording, name, ...changes], {encoding: 'utf8'});
  assert.equal(status, 0, stderr);
  return name;
}

// The example host, other than it is in what the patterns find: [pattern, other]...
export function otherHost(...changes) {
  const example = readFileSync(new URL('../../examples/hypervisor.json', import.meta.url), 'utf8');
  const name = scratchName('');
  writeFileSync(`${name}.json`, changes.reduce((text, [pattern, other]) => {
    const changed = text.replace(pattern, other);
    assert.notEqual(changed, text, `${pattern} is not in the example`);
    return changed;
  }, example));
  ksicache('load', `${name}.json`, `${name}.ksi`);
  return `${name}.ksi`;
}

// One recording of captures.
export function joined(...captures) {
  const name = scratchName('.rec');
  ksicache('join', name, ...captures);
  return name;
}

// The example host with so many heaps more; what their names begin with.
export function hostWithHeaps(count, start = 'heap') {
  const lines = readFileSync(new URL('../../examples/hypervisor.json', import.meta.url), 'utf8').split('\n');
  const heap = lines.findIndex((line) => line.includes('"node":"system/heaps/stats","keys":["acpi"]'));
  const names = Array.from({length: count}, (_, i) => `${start}${i}`);
  const list = lines.findIndex((line) => line.includes('"node":"system/heaps","keys":[]'));
  lines[list] = lines[list].replace(']},', `,${names.map((name) => `"${name}"`).join(',')}]},`);
  lines.splice(heap, 0, ...names.map((name) => lines[heap].replaceAll('"acpi"', `"${name}"`).replace(/,?$/, ',')));
  const [json, capture] = ['heaps.json', 'heaps.ksi'].map((name) => join(scratch, name));
  writeFileSync(json, lines.join('\n'));
  ksicache('load', json, capture, '--force');
  return capture;
}

// Makes a page of what stands in the build tree, or elsewhere; gives its name.
export function makePage(of, ...options) {
  return makePageBy(ksicache, of, ...options);
}

export function makePageBy(program, of, ...options) {
  const name = scratchName('.html');
  program('page', of, '-o', name, ...options);
  return name;
}
