// Pages of what stands in the build tree, in a browser.
import {execFileSync} from 'node:child_process';
import {mkdtempSync, rmSync} from 'node:fs';
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

export function ksicache(...words) {
  return execFileSync(join(build, 'ksicache'), words, {encoding: 'utf8', maxBuffer: 1 << 28});
}

// Makes a page of what stands in the build tree, or elsewhere; gives its name.
export function makePage(of, ...options) {
  const name = join(scratch, `${Math.random().toString(36).slice(2)}.html`);
  ksicache('page', of, '-o', name, ...options);
  return name;
}
