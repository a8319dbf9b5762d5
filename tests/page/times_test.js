// What happened between moments is seen: gaps, restarts, a clock that was set, damage, and reads
// that failed.
import assert from 'node:assert/strict';
import {readFileSync, writeFileSync} from 'node:fs';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, ksicache, ksicachePartly, makePage, makePageBy, openPage, reshaped, scratch} from './browser.js';

// A moment each two minutes, from 13:00 to 17:00.
const AFTERNOON = join(build, 'afternoon.rec');

async function remarksOf(page) {
  return page.locator('.remarks li').allTextContents();
}

// The pieces that the parts of the balance are drawn in, from the left, [from, to] each.
async function piecesOf(page) {
  return page.locator('.when .area.free').evaluateAll((all) => all.map((each) => {
    const {x, width} = each.getBBox();
    return [x, x + width];
  }));
}

async function marksOf(page, kind) {
  return page.locator(`.when .mark.${kind}`).evaluateAll((all) => all.map((each) => {
    const {x, width} = each.querySelector('rect').getBBox();
    return {from: x, to: x + width, text: each.querySelector('text')?.textContent ?? '', title: each.querySelector('title').textContent};
  }));
}

function isNear(a, b) {
  return Math.abs(a - b) <= 2;
}

// Between the two pieces of the balance there is nothing but the mark.
async function expectHole(page, kind) {
  const pieces = await piecesOf(page);
  const [mark, ...others] = await marksOf(page, kind);
  assert.deepEqual(others, []);
  assert.equal(pieces.length, 2);
  assert.ok(isNear(pieces[0][1], mark.from) && isNear(pieces[1][0], mark.to), `${JSON.stringify(pieces)} around ${JSON.stringify(mark)}`);
  assert.ok(mark.to - mark.from > 3);
  // No line bridges it either.
  for (const path of await page.locator('path.line').all()) {
    const {x, width} = await path.evaluate((each) => { const {x, width} = each.getBBox(); return {x, width}; });
    assert.ok(x + width <= mark.from + 5 || x >= mark.to - 5, `a line from ${x} on, ${width} wide`);
  }
  return mark;
}

test('a gap', async () => {
  const page = await openPage(makePage(reshaped(AFTERNOON, '60:gap:3600')));
  assert.deepEqual(await remarksOf(page), ['2026-11-21 17:00:00 (16:00:00 UTC): nothing recorded in the 1 h 2 min before']);
  const mark = await expectHole(page, 'gap');
  assert.equal(mark.text, 'gap');
  // Nothing is told of it, in both charts; the moments at its ends are there.
  for (const chart of await page.locator('.chart').all()) {
    await chart.scrollIntoViewIfNeeded();
    const {x, y} = await chart.boundingBox();
    const told = chart.locator('xpath=ancestor::section').locator('.detail');
    await page.mouse.move(x + (mark.from + mark.to) / 2, y + 80);
    assert.equal(await told.textContent(), '2026-11-21 17:00:00 (16:00:00 UTC): nothing recorded in the 1 h 2 min before');
    await page.mouse.move(x + mark.from - 3, y + 80);
    assert.match(await told.textContent(), /^2026-11-21 15:58:00 /);
  }
  await closePage(page);
});

// The incident, whose last but one moment was hard, and after a gap its last one.
test('a state of the memory ends where nothing is known', async () => {
  const page = await openPage(makePage(reshaped(join(build, 'incident.rec'), '4:gap:3600')));
  const [mark] = await marksOf(page, 'gap');
  const bars = await page.locator('.when .state').evaluateAll((all) => all.map((each) => each.getBBox()).map(({x, width}) => [x, x + width]));
  assert.equal(bars.length, 1);
  assert.ok(isNear(bars[0][0], mark.from) && bars[0][1] < mark.from + 6, `${bars[0]} before ${JSON.stringify(mark)}`);
  await closePage(page);
});

test('a restart', async () => {
  const page = await openPage(makePage(reshaped(AFTERNOON, '60:reboot')));
  assert.deepEqual(await remarksOf(page), ['2026-11-21 16:00:00 (15:00:00 UTC): restarted, 2 min between the moments']);
  assert.equal((await expectHole(page, 'reboot')).text, 'restart');
  assert.match(await page.locator('.changes .note').first().textContent(), /The host was started anew in between/);
  await closePage(page);
});

test('moments that cannot be read', async () => {
  const page = await openPage(makePageBy(ksicachePartly, reshaped(AFTERNOON, '50:damage')));
  const remarks = await remarksOf(page);
  assert.match(remarks[0], /^2026-11-21 \d\d:\d\d:00 .* nothing that can be read in the \d+ min before$/);
  assert.ok(remarks.some((remark) => /damaged/.test(remark)), remarks.join('\n'));
  assert.equal((await expectHole(page, 'lost')).text, 'damage');
  await closePage(page);
});

test('a line whose stretch of moments has a gap within', async () => {
  const page = await openPage(makePage(AFTERNOON));
  const times = await page.evaluate(() => {
    const points = [{from: 0, to: 10}, {from: 20, to: 60}, {from: 70, to: 80}];
    return module_chart.runsOf(points, [{kind: 'gap', steady: 50}], () => true).map((run) => run.map(({time}) => time));
  });
  assert.deepEqual(times, [[5, 20], [60, 75]]);
  await closePage(page);
});

// Each moment stands where it was: none lies on another.
for (const [name, seconds, text] of [['back', -5400, 'back by 1 h 30 min'], ['forward', 86400, 'forward by 1 d']]) {
  test(`a clock that was set ${name}`, async () => {
    const page = await openPage(makePage(reshaped(AFTERNOON, `60:clock:${seconds}`)));
    const [remark] = await remarksOf(page);
    assert.match(remark, new RegExp(`the clock was set ${text}$`));
    const [piece, ...others] = await piecesOf(page);
    assert.deepEqual(others, []);
    const [mark] = await marksOf(page, 'clock');
    assert.equal(mark.text, 'clock');
    assert.ok(isNear(mark.from, (piece[0] + piece[1]) / 2), `${mark.from} in ${piece}`);
    const lines = await page.locator('.when .full').getAttribute('d');
    const places = [...lines.matchAll(/M([\d.]+),/g)].map(([, x]) => Number(x));
    assert.equal(places.length, 121);
    assert.ok(places.every((x, i) => i === 0 || x > places[i - 1]));
    assert.match(await page.locator('header p').first().textContent(), /121 moments in 4 h, all of them in full$/);
    // The first moment after it, by a click.
    const chart = await page.locator('.when .chart').boundingBox();
    await page.mouse.click(chart.x + places[60], chart.y + 80);
    assert.equal(await page.locator('#slider-at').inputValue(), '60');
    const time = (await page.locator('.when .detail strong').textContent()).slice(0, 19);
    assert.equal(Date.parse(`${time.replace(' ', 'T')}+01:00`), Date.parse('2026-11-21T15:00:00Z') + 1000 * seconds);
    await closePage(page);
  });
}

test('all of it at once, and a page of a span', async () => {
  const recording = reshaped(AFTERNOON, '30:gap:1800', '60:reboot', '90:clock:-600');
  const page = await openPage(makePage(recording));
  assert.equal((await remarksOf(page)).length, 3);
  assert.equal((await piecesOf(page)).length, 3);
  await closePage(page);
  const part = await openPage(makePage(`${recording}@13:10Z..13:30Z`));
  assert.deepEqual(await remarksOf(part), []);
  await closePage(part);
});

// One that was refused, one that failed and one of what the host does not have.
test('reads of a capture that failed', async () => {
  const lines = readFileSync(new URL('../../examples/hypervisor.json', import.meta.url), 'utf8').split('\n');
  const failing = lines.map((line) => {
    const status = {1010: '0xbad005a', 1020: '0xbad0001', 1030: '0xbad0003'}[/"sched\/groups\/stats\/memoryStats","keys":\[(\d+)\]/.exec(line)?.[1]];
    return status === undefined ? line : line.replace(/"value":\{.*\}\}/, `"status":"${status}"}`);
  });
  const [json, capture] = ['failing.json', 'failing.ksi'].map((name) => join(scratch, name));
  writeFileSync(json, failing.join('\n'));
  ksicache('load', json, capture);
  const page = await openPage(makePageBy(ksicachePartly, capture));
  const remarks = await remarksOf(page);
  assert.ok(remarks.includes('1 read refused for want of rights'), remarks.join('\n'));
  assert.ok(remarks.includes('1 read failed'), remarks.join('\n'));
  await closePage(page);
  const still = await openPage(makePageBy(ksicachePartly, capture), {javaScriptEnabled: false});
  assert.deepEqual((await still.locator('h3 + ul li').allTextContents()).slice(0, 2), [
    'reads of a moment that were refused for want of rights: 1', 'reads of a moment that failed: 1']);
  await closePage(still);
});
