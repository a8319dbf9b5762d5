// What changed is what `ksicache diff --json` says of the same two moments, to the last digit.
import assert from 'node:assert/strict';
import {writeFileSync} from 'node:fs';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, joined, ksicache, ksicachePartly, makePageBy, openPage, otherHost, scratch} from './browser.js';

const HOST = ['total', 'free', 'used', 'kernel', 'caches', 'others'];

function shown(number) {
  return number === null ? '–' : String(number);
}

function growth(number) {
  return number > 0 ? `+${number}` : shown(number);
}

async function cellsOf(table) {
  return table.evaluate((each) => [...each.rows].map((row) => [...row.cells].map((cell) => cell.textContent)));
}

function isTold(part) {
  return part.added && (!part.known || part.before !== 0 || part.after !== 0 || part.withoutFigure > 0 || part.rows.length > 0);
}

// The tables of the host as the program's answer has them, without the parts of the whole.
function expectedHost(diff) {
  const figures = (name, {before, after, growth: by}) => [name, shown(before), shown(after), growth(by)];
  const parts = diff.parts.filter(isTold);
  const title = ({known, count, what, withoutFigure}) => `${known ? `${count} ${what}` : `${what}: not known`}${withoutFigure > 0 ? `, ${withoutFigure} more without a figure, not added` : ''}`;
  return [
    ...HOST.map((name) => figures(name, diff.host[name])),
    ...parts.map((part) => figures(title(part), part)),
    ['nobody', '', '', growth(diff.nobody)],
  ];
}

// Where the page has a number behind the name of one of several, the program's answer has it apart.
function nameAsProgram(things, rows) {
  const numbered = things.filter((cells) => cells[2] !== '–').map((cells) => cells[1]);
  assert.equal(new Set(numbered).size, numbered.length);
  things.forEach((cells, i) => {
    const {name, group} = rows[i] ?? {};
    if (cells[1] === `${name} ${group < 2 ** 40 ? group : group - 2 ** 40}`) cells[1] = name;
  });
}

// Expects what the answer says, and gives the shares of the growth.
async function expectChanges(page, diff) {
  const tables = page.locator('.changes table.balance');
  const rows = [...await cellsOf(tables.first()), ...await cellsOf(tables.last())];
  const host = rows.filter((row) => !['the host', 'who explains it'].includes(row[0])).map((row) => row.slice(0, 4));
  host.slice(0, HOST.length).forEach((row, i) => { row[0] = HOST[i]; });
  assert.deepEqual(host, expectedHost(diff));
  const shares = new Map();
  for (const part of diff.parts) {
    await page.selectOption('.changes label:has-text("Of") select', part.what);
    const more = page.locator('.changes .more');
    if (await more.isVisible()) await more.click();
    const things = (await cellsOf(page.locator('.changes table.grid'))).slice(1);
    shares.set(part.what, things.map((cells) => cells.pop()));
    nameAsProgram(things, part.rows);
    const expected = part.rows.map((row) => [part.what, row.name, shown(row.group ?? null), row.state, shown(row.before), shown(row.after), growth(row.growth)]);
    assert.deepEqual(things, expected, part.what);
  }
  const lastOf = (all) => all.slice(1).map((row) => row.at(-1));
  const [ofHost, who] = [lastOf(await cellsOf(tables.first())), lastOf(await cellsOf(tables.last()))];
  const told = diff.parts.filter(isTold);
  return [...ofHost.slice(2), ...told.flatMap(({what}, i) => [who[i], ...shares.get(what)]), who.at(-1), ofHost[2], ...shares.get('groups')];
}

// Of what is in use, how much each is of its growth, in the order of the screen.
function sharesIn(screen) {
  return [...screen.matchAll(/ (\S+%)$/gm)].map(([, share]) => share);
}

async function compare(recording, pairs, units, program = ksicache) {
  const page = await openPage(makePageBy(program, recording));
  const times = ksicache('export', 'moments', `${recording}@..`).trimEnd().split('\n').slice(1).map((line) => line.split(',')[1]);
  for (const [from, at] of pairs) {
    await page.fill('#slider-from', String(from));
    await page.fill('#slider-at', String(at));
    for (const unit of units) {
      await page.selectOption('.changes label:has-text("Changes in") select', unit);
      const words = ['--top', '100000', '-u', unit, `${recording}@${times[from]}`, `${recording}@${times[at]}`];
      const diff = JSON.parse(program('diff', '--json', ...words));
      const shares = await expectChanges(page, diff);
      if (diff.host.used.growth) assert.deepEqual(shares, sharesIn(program('diff', ...words)));
    }
  }
  await closePage(page);
}

test('the incident, in every unit', async () => {
  await compare(join(build, 'incident.rec'), [[0, 3], [3, 4], [0, 4], [2, 3]], ['mb', 'kb', 'pg', 'b']);
});

test('the afternoon', async () => {
  await compare(join(build, 'afternoon.rec'), [[0, 120], [60, 61], [30, 75]], ['mb', 'b']);
});

// 1, 5 and 194 KB of 200.
test('halves of a percent', async () => {
  const after = otherHost(['T10:00:00Z', 'T10:01:00Z'], ['"free":138092636', '"free":138092436'], ['"dataAndHeap":3145728', '"dataAndHeap":3145729'],
    ['"knvClientConsumed":5242880', '"knvClientConsumed":5242885'], ['"otherConsumed":117170084', '"otherConsumed":117170278']);
  await compare(joined(otherHost(), after), [[0, 1]], ['kb']);
});

// The incident's moments of 10:02 and 10:04; of the latter a machine could not be read.
function recordingInPart() {
  const whole = join(build, 'incident.rec');
  const [before, after, json] = ['before.ksi', 'after.ksi', 'after.json'].map((name) => join(scratch, name));
  const dump = ksicache('dump', '--json', `${whole}@10:04Z`);
  const stats = /("node":"sched\/groups\/stats\/memoryStats","keys":\[1000\],)"value":\{.*\}\}/;
  assert.match(dump, stats);
  writeFileSync(json, dump.replace(stats, '$1"status":"0xbad005a"}'));
  ksicache('load', '--force', json, after);
  ksicache('extract', '--force', `${whole}@first`, before);
  return joined(before, after);
}

// It takes the others with it in no table.
test('a moment that is not whole', async () => {
  await compare(recordingInPart(), [[0, 1]], ['kb'], ksicachePartly);
});

test('what is not known is not called unchanged', async () => {
  const page = await openPage(makePageBy(ksicachePartly, joined(otherHost(), otherHost(
    ['T10:00:00Z', 'T10:01:00Z'], [/("node":"system\/heaps","keys":\[\],)"instances":\[.*\]\}/, '$1"status":"0xbad0001"}']))));
  const caption = page.locator('.changes .note', {hasText: 'rows'});
  assert.match(await caption.textContent(), /, MB, heaps not known: 0 rows$/);
  await page.selectOption('.changes label:has-text("Of") select', 'machines');
  assert.match(await caption.textContent(), /, MB: 0 rows$/);
  await closePage(page);
});

test('a sum of which something is missing is none', async () => {
  const page = await openPage(makePageBy(ksicachePartly, recordingInPart()));
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  await lines.locator('select').selectOption({label: 'Machines: consumed'});
  await lines.locator('label', {hasText: 'all together'}).locator('input').check();
  await page.click('text=First moment');
  assert.match(await lines.locator('.detail').textContent(), /all together \d+ GB/);
  await page.click('text=Last moment');
  assert.match(await lines.locator('.detail').textContent(), /all together – .*build-linux/);
  await closePage(page);
});

test('a live host', async () => {
  const recording = join(scratch, 'live.rec');
  ksicache('record', recording, '--every', '1s', '--count', '3');
  await compare(recording, [[0, 2], [1, 2]], ['kb']);
});
