// Nothing that a capture says becomes markup or script, however its names are made.
import assert from 'node:assert/strict';
import {readFileSync, writeFileSync} from 'node:fs';
import {join} from 'node:path';
import {test} from 'node:test';
import {closePage, joined, ksicache, makePage, openPage, otherHost, scratch} from './browser.js';

// One reading a line; its numbers of 64 bits are none of JavaScript's.
const EXAMPLE = readFileSync(new URL('../../examples/hypervisor.json', import.meta.url), 'utf8').split('\n');
const NAME = /("node":"sched\/groups\/group(Name|Tag)".*"value":)\{[^}]*\}/;

const NAMES = [
  '</script><script>alert(1)</script>', '<img src=x onerror=alert(1)>', '"><svg onload=alert(1)>', '<!--', '-->', ']]>',
  "'); alert(1); ('", '{{head}}', '${1}', '&lt;b&gt;', '\u202egnp.exe', 'a\u0000b', '\u001b[31m', 'line\nbreak', '\u2066x\u2069',
  '\u200b', '   ', '__proto__', 'constructor', '=1+1', '"quoted", with comma', 'javascript:alert(1)', '\ud83d\ude00', '漢字', 'e\u0301'.repeat(20),
];

// The same numbers every time.
function random(seed) {
  let state = seed;
  return (most) => {
    state = (state * 1103515245 + 12345) % 2147483648;
    return Math.floor(state / 65536) % most;
  };
}

const PIECES = ['<', '>', '&', '"', "'", '/', 'script', 'style', '</', '<!--', '-->', '=', '`', '\\', '\u0000', '\u202e', '\u2028', '\ufeff', '\u00a0', '\t', '\ud800', '\udfff', '\u{e0001}', 'x', '7'];

function fuzzedName(next) {
  return Array.from({length: 1 + next(12)}, () => PIECES[next(PIECES.length)]).join('');
}

// Names as bytes, which need not be UTF-8.
function bytesOf(name) {
  return typeof name === 'string' ? Buffer.from(name, 'utf8') : name;
}

// The example host with other names of its groups, and of itself.
function hostWith(names, host) {
  let next = 0;
  const lines = EXAMPLE.map((line) => line
    .replace('"hypervisor.example.org"', () => JSON.stringify(host))
    .replace(NAME, (_, start, what) => {
      const size = what === 'Name' ? 64 : 8;
      const field = Buffer.alloc(size);
      bytesOf(names[next++ % names.length]).copy(field, 0, 0, size - 1);
      return `${start}{"text":{"hex":"${field.toString('hex')}"}}`;
    }));
  const json = join(scratch, 'hostile.json');
  writeFileSync(json, lines.join('\n'));
  const file = join(scratch, 'hostile.ksi');
  ksicache('load', json, file, '--force');
  return file;
}

// What the page consists of, without its texts.
async function elementsOf(page) {
  return page.evaluate(() => ({
    scripts: document.scripts.length,
    strange: document.querySelectorAll('img, iframe, object, embed, form, a, link, base, video, audio, style ~ style, svg svg').length,
    handlers: [...document.querySelectorAll('*')].filter((each) => [...each.attributes].some(({name}) => name.startsWith('on'))).length,
    controls: /[\u0000-\u0008\u000e-\u001f\u200b-\u200f\u202a-\u202e\u2066-\u2069]/.test(document.getElementById('page').innerText),
  }));
}

const SOUND = {scripts: 6, strange: 0, handlers: 0, controls: false};

async function look(names, host, title) {
  const file = hostWith(names, host);
  const name = makePage(file, '--title', title);
  const still = await openPage(name, {javaScriptEnabled: false});
  await closePage(still);
  const page = await openPage(name);
  assert.deepEqual(await elementsOf(page), SOUND);
  // All names in all places that they can be in.
  for (const report of ['group-stats', 'vm-stats', 'lpool-stats', 'asyncremap-stats']) {
    await page.selectOption('.reports label:has-text("Report") select', {label: report});
    assert.deepEqual(await elementsOf(page), SOUND);
  }
  await page.locator('.tile', {hasText: 'Free'}).hover();
  assert.deepEqual(await elementsOf(page), SOUND);
  return page;
}

test('names that would be markup, script or other text', async () => {
  const long = 'L<'.repeat(2000);
  for (const title of [NAMES[0], long]) {
    const page = await look(NAMES, `${NAMES[0]}${long}`.slice(0, 4000), title);
    const overflow = await page.evaluate(() => document.documentElement.scrollWidth - document.documentElement.clientWidth);
    assert.equal(overflow, 0);
    await closePage(page);
  }
});

test('names are shown as they are, and what hides is written out', async () => {
  const page = await look(NAMES, 'host', 'title');
  await page.selectOption('.reports label:has-text("Report") select', {label: 'group-stats'});
  const cells = await page.locator('.reports').evaluate((reports) => reports.textContent);
  assert.match(cells, /<\/script><script>alert\(1\)<\/script>/);
  assert.match(cells, /\\xe2\\x80\\xaegnp\.exe/);
  assert.match(cells, /\\x1b\[31m/);
  await closePage(page);
});

test('names that a spreadsheet would compute are told of', async () => {
  const page = await openPage(makePage(hostWith(['=cmd|calc!A0', '+SUM(A1)', '@x', ' blanks '], 'host')), {permissions: ['clipboard-read', 'clipboard-write']});
  await page.selectOption('.reports label:has-text("Report") select', {label: 'vm-stats'});
  await page.locator('.reports button', {hasText: 'Copy as CSV'}).click();
  const told = page.locator('.reports [role=status]', {hasText: 'rows copied'});
  await told.waitFor();
  assert.match(await told.textContent(), /^\d+ rows copied; [1-9]\d* of their texts would be formulas in a spreadsheet: paste them as text$/);
  await closePage(page);
});

test('a name that is very long buries nothing', async () => {
  const long = 'long '.repeat(800).trim();
  const page = await openPage(makePage(hostWith(['x'], 'host'), '--title', long), {viewport: {width: 360, height: 780}});
  const title = page.locator('h1');
  const short = (await title.boundingBox()).height;
  assert.ok(short < 100, `${short} pixels`);
  assert.equal(await title.getAttribute('title'), long);
  await page.keyboard.press('Tab');
  assert.ok((await title.boundingBox()).height > 10 * short);
  await closePage(page);
});

test('names of any bytes', async () => {
  const next = random(1);
  for (let round = 0; round < 8; ++round) {
    const names = Array.from({length: 120}, () => (next(4) === 0
      ? Buffer.from(Array.from({length: 1 + next(40)}, () => 1 + next(255))) : fuzzedName(next)));
    await closePage(await look(names, 'host', `title ${fuzzedName(next).replaceAll('\u0000', '')}`));
  }
});

test('a host whose name is no UTF-8', async () => {
  const page = await openPage(makePage(otherHost(['"hypervisor.example.org"', '{"hex":"ff41"}'])));
  assert.equal(await page.locator('h1').textContent(), '%ffA');
  assert.equal(await page.locator('header b').textContent(), '%ffA');
  await closePage(page);
});

// Figures and times that are no whole numbers of a browser's, and what is beside them.
for (const consumed of ['4503599627370000', '6000000000000000', '9007199254740993', '18446744073709551614']) {
  test(`a group with ${consumed} KB`, async () => {
    const large = otherHost([/("node":"sched\/groups\/stats\/memoryStats","keys":\[307\],.*"consumed":)\d+/, `$1${consumed}`]);
    const later = otherHost(['T10:00:00Z', 'T10:01:00Z']);
    const page = await openPage(makePage(joined(large, later)));
    await page.click('text=First moment');
    await page.locator('.reports input[type=search]').fill('storage-daemon');
    const place = (await page.locator('.reports thead th').allTextContents()).indexOf('consumed');
    assert.equal(await page.locator('.reports tbody tr > *').nth(place).textContent(), consumed);
    const lines = page.locator('section', {has: page.locator('#lines-title')});
    await lines.locator('select').selectOption({label: 'Groups: consumed'});
    await page.click('text=Last moment');
    assert.match(await lines.locator('.detail').textContent(), /host 124 GB · machines 110 GB/);
    await closePage(page);
  });
}

for (const year of ['1969', '2112', '2155', '9999']) {
  test(`moments of the year ${year}`, async () => {
    const [first, last] = ['23:53:40', '23:53:48'].map((time) => otherHost(['2026-11-21T10:00:00Z', `${year}-09-17T${time}Z`]));
    const page = await openPage(makePage(joined(first, last)));
    await page.click('text=Last moment');
    assert.match(await page.locator('.when .time').first().textContent(), new RegExp(`\\(${year}-09-17 23:53:48 UTC\\)$`));
    assert.match(await page.locator('header p').first().textContent(), /2 moments in 8 s, all of them in full$/);
    await closePage(page);
  });
}

test('free memory that is not known is none', async () => {
  const [unknown, least] = [['10:01', '18446744073709551615'], ['10:02', '100000000']]
    .map(([time, free]) => otherHost(['T10:00:', `T${time}:`], ['"free":138092636', `"free":${free}`]));
  const page = await openPage(makePage(joined(otherHost(), unknown, least)));
  assert.match(await page.locator('.short').textContent(), /^95\.4 GB of 256 GB free at 2026-11-21 11:02:00 .*, the least of all/);
  assert.match(await page.locator('.when .least').textContent(), /^the least that was free: 95\.4 GB at 2026-11-21 11:02:00 /);
  assert.equal(await page.locator('.when .area.free').count(), 2);
  await page.fill('#slider-at', '1');
  assert.match(await page.locator('.when .detail').textContent(), / Free – · Machines and processes 112 GB · .* · Not told apart – · Taken at start 4\.50 GB · /);
  assert.equal(await page.locator('.tile', {hasText: 'Free'}).count(), 0);
  await closePage(page);
});

test('a name that is read from the right turns nothing around it', async () => {
  const name = 'שרת דואר 1';
  const page = await openPage(makePage(joined(otherHost(), otherHost(
    ['T10:00:00Z', 'T10:01:00Z'], [/("node":"sched\/groups\/groupName","keys":\[1060\].*)"build-linux"/, `$1"${name}"`],
    [/("node":"sched\/groups\/stats\/memoryStats","keys":\[106[01]\],.*?"consumed":)\d+/g, '$19999999'], ['"free":138092636', '"free":128092636']))));
  await page.click('text=Last moment');
  await page.mouse.move(0, 0);
  const tile = page.locator('.tile', {hasText: name});
  assert.equal(await tile.locator('.name').evaluate((each) => getComputedStyle(each).direction), 'rtl');
  await tile.focus();
  await page.keyboard.press('Enter');
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  await lines.locator('select').selectOption({label: 'Machines: consumed'});
  for (const box of await lines.locator('.lines input').all()) await box.check();
  for (const place of ['.short', '.where .detail', 'section:has(#lines-title) .detail']) {
    const [isolated, others] = await page.locator(place).evaluate((each) => {
      const bare = each.cloneNode(true);
      bare.querySelectorAll('bdi').forEach((one) => one.remove());
      return [[...each.querySelectorAll('bdi')].map((one) => one.textContent), bare.textContent];
    });
    assert.ok(isolated.includes(name), `${place}: ${isolated.join()}`);
    assert.ok(!/\p{Script=Hebrew}/u.test(others), others);
  }
  await closePage(page);
});

test('sums that no browser counts exactly', async () => {
  const page = await openPage(makePage(otherHost()));
  const sums = await page.evaluate(() => [[2, -5], [2 ** 53 - 1, 1], [2n ** 60n, -(2n ** 60n) + 5n], [2n ** 54n, -(2 ** 53) + 1]]
    .map(([a, b]) => module_bytes.plus(a, b)).map((sum) => `${typeof sum} ${sum}`));
  assert.deepEqual(sums, ['number -3', 'bigint 9007199254740992', 'number 5', 'bigint 9007199254740993']);
  await closePage(page);
});
