// What the page shows as tables is what `ksicache export` writes of that moment, cell by cell.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, ksicache, makePage, openPage} from './browser.js';

const RECORDING = join(build, 'incident.rec');
const FLAGS = {'': '–', true: 'y', false: 'n'};
const MOMENTS = ['10:02', '10:03', '10:04', '10:05', '10:06'];

// The fields of CSV, as the page shows them, without host and time.
function rowsOf(csv) {
  return csv.trimEnd().split('\n').map((line) => fieldsOf(line).slice(2));
}

function fieldsOf(line) {
  const fields = [];
  for (const [, field, end] of line.matchAll(/("(?:[^"]|"")*"|[^,]*)(,|$)/g)) {
    fields.push(field.startsWith('"') ? field.slice(1, -1).replaceAll('""', '"') : FLAGS[field] ?? field);
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
  return rowsOf(ksicache('export', report, ...flags, `${RECORDING}@${moment}Z`));
}

async function compare(page, report, moment, unit) {
  await page.selectOption('.reports label:has-text("Report") select', {label: report});
  await page.selectOption('.reports label:has-text("Memory in") select', unit);
  assert.deepEqual(await shownRows(page), exported(report, moment, unit), `${report} at ${moment} in ${unit}`);
}

test('every report at every moment, in its own unit', async () => {
  const page = await openPage(makePage(RECORDING));
  const reports = await page.locator('.reports label:has-text("Report") option').allTextContents();
  assert.equal(reports.length, 15);
  for (const [place, moment] of MOMENTS.entries()) {
    await page.fill('#slider-at', String(place));
    for (const report of reports) await compare(page, report, moment, '');
  }
  await closePage(page);
});

test('every report in every unit', async () => {
  const page = await openPage(makePage(RECORDING));
  const reports = await page.locator('.reports label:has-text("Report") option').allTextContents();
  await page.fill('#slider-at', '4');
  for (const unit of ['mb', 'kb', 'pg', 'b']) {
    for (const report of reports) await compare(page, report, '10:06', unit);
  }
  await closePage(page);
});
