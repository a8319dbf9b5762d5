// On paper: light, nothing cut off, and what is left out is said.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, hostWithHeaps, makePage, openPage} from './browser.js';

const RECORDING = join(build, 'incident.rec');

// A4 in the browser's pixels, less margins of 1 cm.
const PORTRAIT = {width: 718, height: 1047};

async function printed(options = {}) {
  const page = await openPage(makePage(RECORDING), {viewport: PORTRAIT, ...options});
  await page.emulateMedia({media: 'print'});
  return page;
}

test('no dark ground, whatever is chosen', async () => {
  const page = await printed({colorScheme: 'dark'});
  assert.equal(await page.evaluate(() => getComputedStyle(document.body).backgroundColor), 'rgb(255, 255, 255)');
  assert.equal(await page.evaluate(() => getComputedStyle(document.body).color), 'rgb(28, 33, 38)');
  await closePage(page);
});

test('nothing is cut off', async () => {
  const page = await printed();
  for (const report of await page.locator('.reports label:has-text("Report") option').allTextContents()) {
    await page.emulateMedia({media: 'screen'});
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    await page.emulateMedia({media: 'print'});
    const cut = await page.evaluate(() => [...document.querySelectorAll('th, td, p, li, caption, .scroller')]
      .filter((each) => each.scrollWidth > each.clientWidth + 1 && getComputedStyle(each).overflowX !== 'visible' && each.clientWidth > 0)
      .map((each) => each.textContent.slice(0, 40)));
    assert.deepEqual(cut, [], report);
  }
  await closePage(page);
});

test('rows that are left out are counted', async () => {
  const page = await openPage(makePage(hostWithHeaps(100)), {viewport: PORTRAIT});
  await page.selectOption('.reports label:has-text("Report") select', {label: 'heap-stats'});
  await page.emulateMedia({media: 'print'});
  const note = page.locator('.reports p.note').first();
  assert.ok(await note.isVisible());
  assert.match(await note.textContent(), /: 114 rows, the first 60 shown$/);
  assert.equal(await page.locator('.reports tbody tr').count(), 60);
  await closePage(page);
});

test('a document of pages', async () => {
  const page = await printed();
  const pdf = await page.pdf({format: 'A4'});
  assert.equal(pdf.subarray(0, 5).toString(), '%PDF-');
  await closePage(page);
});
