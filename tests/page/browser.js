// A page in Debian's Chromium, which may ask for nothing and say nothing on its console.
import assert from 'node:assert/strict';
import {execFileSync} from 'node:child_process';
import {mkdtempSync, rmSync} from 'node:fs';
import {tmpdir} from 'node:os';
import {join} from 'node:path';
import {after} from 'node:test';
import {pathToFileURL} from 'node:url';
import {chromium} from 'playwright-core';

export const build = process.env.BUILD;
export const scratch = mkdtempSync(join(tmpdir(), 'page-'));

// As root there is no sandbox; the rest keeps it from looking for its maker's hosts.
const FLAGS = ['--disable-gpu', '--disable-quic', '--no-first-run', '--disable-background-networking',
  '--disable-component-update', '--disable-sync', '--font-render-hinting=none',
  ...(process.getuid() === 0 ? ['--no-sandbox'] : [])];

const browser = await chromium.launch({executablePath: process.env.CHROMIUM, args: FLAGS});

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

// Opens a page; `wrong` collects what it must not do.
export async function openPage(name, options = {}) {
  const context = await browser.newContext({
    viewport: {width: 1280, height: 900}, timezoneId: 'Europe/Berlin', locale: 'en-GB', ...options,
  });
  const page = await context.newPage();
  page.setDefaultTimeout(10000);
  page.wrong = [];
  page.on('console', (message) => page.wrong.push(`console: ${message.text()}`));
  page.on('pageerror', (error) => page.wrong.push(`error: ${error.stack}`));
  page.on('dialog', (dialog) => page.wrong.push(`dialog: ${dialog.message()}`));
  page.on('request', (request) => {
    if (request.url() !== pathToFileURL(name).href) page.wrong.push(`request: ${request.url()}`);
  });
  await page.goto(pathToFileURL(name).href);
  if (options.javaScriptEnabled !== false) await page.waitForSelector('html[data-ready]');
  return page;
}

// The end of a page that did nothing that it must not.
export async function closePage(page) {
  assert.deepEqual(page.wrong, []);
  await page.context().close();
}
