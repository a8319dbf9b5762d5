// What the page shows as tables is what `ksicache export` writes of that moment, cell by cell.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, ksicache, makePage, openPage, scratch} from './browser.js';

const INCIDENT = join(build, 'incident.rec');
const NONE = '–';
const MOMENTS = ['10:02', '10:03', '10:04', '10:05', '10:06'];

// The fields of CSV, as the page shows them, without host and time.
function rowsOf(csv) {
  return csv.trimEnd().split('\n').map((line) => fieldsOf(line).slice(2));
}

function fieldsOf(line) {
  const fields = [];
  for (const [, field, end] of line.matchAll(/("(?:[^"]|"")*"|[^,]*)(,|$)/g)) {
    fields.push(field.startsWith('"') ? field.slice(1, -1).replaceAll('""', '"') : field === '' ? NONE : field);
    if (end === '') break;
  }
  return fields;
}

async function shownRows(page) {
  const more = page.locator('.reports .more');
  if (await more.isVisible()) await more.click();
  return page.locator('.reports table').evaluate((table) =>
    [...table.rows].map((row) => [...row.cells].map((cell) => cell.textContent)));
}

function exported(report, moment, unit) {
  const flags = unit === '' ? [] : ['-u', unit];
  return rowsOf(ksicache('export', report, ...flags, moment));
}

// `moment`: the name of what the page shows at the time.
async function compare(page, moment, unit) {
  const reports = await page.locator('.reports label:has-text("Report") option').allTextContents();
  assert.equal(reports.length, 15);
  await page.selectOption('.reports label:has-text("Memory in") select', unit);
  for (const report of reports) {
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    assert.deepEqual(await shownRows(page), exported(report, moment, unit), `${report} of ${moment} in ${unit}`);
  }
}

test('every report at every moment, in its own unit', async () => {
  const page = await openPage(makePage(INCIDENT));
  for (const [place, moment] of MOMENTS.entries()) {
    await page.fill('#slider-at', String(place));
    await compare(page, `${INCIDENT}@${moment}Z`, '');
  }
  await closePage(page);
});

test('every report copied is what is exported, to the byte', async () => {
  const page = await openPage(makePage(INCIDENT), {permissions: ['clipboard-read', 'clipboard-write']});
  await page.fill('#slider-at', '4');
  for (const report of await page.locator('.reports label:has-text("Report") option').allTextContents()) {
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    await page.locator('.reports button', {hasText: 'Copy as CSV'}).click();
    await page.locator('.reports [role=status]', {hasText: 'rows copied'}).waitFor();
    assert.equal(await page.evaluate(() => navigator.clipboard.readText()), ksicache('export', report, `${INCIDENT}@10:06Z`), report);
  }
  await closePage(page);
});

test('every report in every unit', async () => {
  const page = await openPage(makePage(INCIDENT));
  await page.fill('#slider-at', '4');
  for (const unit of ['mb', 'kb', 'pg', 'b']) await compare(page, `${INCIDENT}@10:06Z`, unit);
  await closePage(page);
});

test('every report at moments of an afternoon', async () => {
  const recording = join(build, 'afternoon.rec');
  const page = await openPage(makePage(recording));
  for (const [place, moment] of [[0, '13:00'], [60, '15:00'], [120, '17:00']]) {
    await page.fill('#slider-at', String(place));
    await compare(page, `${recording}@${moment}Z`, '');
  }
  await closePage(page);
});

test('every report of this host', async () => {
  const capture = join(scratch, 'live.ksi');
  ksicache('capture', capture);
  const page = await openPage(makePage(capture));
  await compare(page, capture, '');
  await closePage(page);
});
