// What was least and greatest is seen, however short it was.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, makePage, openPage, reshaped} from './browser.js';

async function heightsOf(page, paths) {
  return page.locator(paths).evaluateAll((all) => all.map((each) => {
    const {y, height} = each.getBBox();
    return [y, y + height].map((at) => Math.round(at * 10));
  }));
}

// So many moments that each point of a chart stands for several.
test('a line goes through the least and the greatest of each stretch', async () => {
  const page = await openPage(makePage(reshaped(join(build, 'afternoon.rec'), '9:again')));
  assert.match(await page.locator('header p').first().textContent(), /each of \d+ stretches/);
  const bands = await heightsOf(page, 'path.band');
  assert.ok(bands.some(([top, bottom]) => top < bottom), 'nothing has changed');
  assert.deepEqual(await heightsOf(page, 'path.line'), bands);
  const far = await page.locator('path.line').evaluateAll((lines) => lines.map((line) =>
    line.getAttribute('d').match(/[\d.]+,[\d.]+/g).map((point) => point.split(',')[0]))
    .some((places) => places.some((x, i) => x === places[i + 1])));
  assert.ok(far, 'no line goes up or down within a stretch');
  await closePage(page);
});

test('the least free memory is seen, with the cursor on it, too', async () => {
  const page = await openPage(makePage(join(build, 'incident.rec')));
  const seen = await page.locator('.when .chart').evaluate((chart) => {
    const [edge, least, cursor] = ['.edge', '.least', '.cursor'].map((name) => chart.querySelector(name));
    const {y} = edge.getBBox();
    const isBehind = (each) => (cursor.compareDocumentPosition(each) & Node.DOCUMENT_POSITION_FOLLOWING) !== 0;
    return {
      width: parseFloat(getComputedStyle(edge).strokeWidth), top: Math.abs(y - least.cy.baseVal.value) < 0.1,
      isAbove: isBehind(edge) && isBehind(least), text: least.textContent,
      isChosen: Math.abs(least.cx.baseVal.value - cursor.querySelector('.at').x1.baseVal.value) < 0.1,
    };
  });
  assert.deepEqual(seen, {width: 2, top: true, isAbove: true, isChosen: true,
    text: 'the least that was free: 900 MB at 2026-11-21 11:05:00 (10:05:00 UTC)'});
  await closePage(page);
});
