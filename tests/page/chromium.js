// Debian's Chromium, in which a page may ask for nothing and say nothing on its console.
import assert from 'node:assert/strict';
import {pathToFileURL} from 'node:url';
import {chromium} from 'playwright-core';

// As root there is no sandbox; the rest keeps it from looking for its maker's hosts.
const FLAGS = ['--disable-gpu', '--disable-quic', '--no-first-run', '--disable-background-networking',
  '--disable-component-update', '--disable-sync', '--font-render-hinting=none',
  ...(process.getuid() === 0 ? ['--no-sandbox'] : [])];

export const browser = await chromium.launch({executablePath: process.env.CHROMIUM ?? '/usr/bin/chromium', args: FLAGS});

// Opens a page, of which nothing is shown if it is not whole; `wrong` collects what it must not do.
export async function openPage(name, {isWhole = true, ...options} = {}) {
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
    if (request.url().replace(/#.*/, '') !== pathToFileURL(name).href) page.wrong.push(`request: ${request.url()}`);
  });
  await page.goto(pathToFileURL(name).href);
  if (isWhole && options.javaScriptEnabled !== false) await page.waitForSelector('html[data-ready]');
  return page;
}

// The end of a page that did nothing that it must not.
export async function closePage(page) {
  assert.deepEqual(page.wrong, []);
  await page.context().close();
}
