// On paper: light, nothing cut off, and what is left out is said.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, hostWithHeaps, makePage, openPage} from './browser.js';

const RECORDING = join(build, 'incident.rec');

// A4 in the browser's pixels, less margins of 1 cm.
const PORTRAIT = {width: 718, height: 1047};
const LANDSCAPE = {width: 1047, height: 718};

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

// What of the page would be cut off.
async function cutOff(page) {
  return page.evaluate(() => {
    const cut = [...document.querySelectorAll('th, td, p, li, caption, .scroller')].filter((each) =>
      each.clientWidth > 0 && each.scrollWidth > each.clientWidth + 1 && getComputedStyle(each).overflowX !== 'visible');
    const {scrollWidth, clientWidth} = document.documentElement;
    return [...cut.map((each) => each.textContent.slice(0, 40)), ...(scrollWidth > clientWidth ? [`${scrollWidth} of ${clientWidth}`] : [])];
  });
}

// Tables of reports are printed in landscape.
test('nothing is cut off', async () => {
  const page = await openPage(makePage(hostWithHeaps(2, 'a-heap-of-a-long-name-')), {viewport: PORTRAIT});
  const reports = await page.locator('.reports label:has-text("Report") option').allTextContents();
  for (const report of reports) {
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    await page.emulateMedia({media: 'print'});
    await page.setViewportSize(LANDSCAPE);
    assert.deepEqual(await cutOff(page), [], report);
    await page.emulateMedia({media: 'screen'});
  }
  await closePage(page);
  const recording = await printed();
  await recording.evaluate(() => { document.querySelector('.reports').hidden = true; });
  assert.deepEqual(await cutOff(recording), []);
  await closePage(recording);
});

test('figures are not broken', async () => {
  const page = await openPage(makePage(RECORDING), {viewport: PORTRAIT});
  for (const report of ['group-stats', 'vm-stats', 'heap-stats', 'swap-stats', 'buddy-stats']) {
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    await page.emulateMedia({media: 'print'});
    await page.setViewportSize(LANDSCAPE);
    const broken = await page.locator('.reports tbody .number').evaluateAll((cells) => cells.filter((cell) => {
      const range = document.createRange();
      range.selectNodeContents(cell);
      return range.getClientRects().length > 1;
    }).map((cell) => cell.textContent));
    assert.deepEqual(broken, [], report);
    await page.emulateMedia({media: 'screen'});
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

// A section that is kept whole leaves half a page empty; what has another page begins one.
test('no page is left half empty', async () => {
  const page = await printed();
  const styles = (name, property) => page.locator(name).evaluateAll((all, each) => all.map((one) => getComputedStyle(one).getPropertyValue(each)), property);
  assert.deepEqual(new Set(await styles('section', 'break-inside')), new Set(['auto']));
  assert.deepEqual(new Set(await styles('.chart, .treemap', 'break-inside')), new Set(['avoid']));
  assert.deepEqual(await styles('footer', 'page'), await styles('.reports', 'page'));
  await closePage(page);
});

test('what has few columns is not as small as what has many', async () => {
  const page = await printed();
  const sizes = {};
  for (const report of ['heap-stats', 'vm-stats']) {
    await page.emulateMedia({media: 'screen'});
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    await page.emulateMedia({media: 'print'});
    sizes[report] = await page.locator('.reports .grid').evaluate((grid) => parseFloat(getComputedStyle(grid).fontSize));
  }
  assert.ok(sizes['heap-stats'] > 1.2 * sizes['vm-stats'], JSON.stringify(sizes));
  await closePage(page);
});

test('a document of pages', async () => {
  const page = await printed();
  const pdf = await page.pdf({format: 'A4'});
  assert.equal(pdf.subarray(0, 5).toString(), '%PDF-');
  await closePage(page);
});
