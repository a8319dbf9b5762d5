// Clicks do what they say, and all that is shown goes by the chosen moment.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, hostWithHeaps, joined, ksicachePartly, makePage, makePageBy, openPage, otherHost, reshaped} from './browser.js';

const RECORDING = join(build, 'incident.rec');
const SIZES = {bytes: 1, KB: 2 ** 10, MB: 2 ** 20, GB: 2 ** 30, TB: 2 ** 40};

// "Free 132 GB" in bytes, to three digits.
function bytesOf(label) {
  const [, number, unit] = /([\d.]+) (bytes|KB|MB|GB|TB)$/.exec(label);
  return Number(number) * SIZES[unit];
}

// The tiles with their sizes and what they say.
async function tilesOf(page) {
  const tiles = await page.locator('.tile').evaluateAll((all) => all.map((tile) => {
    const {left, top, right, bottom} = tile.getBoundingClientRect();
    return {label: tile.getAttribute('aria-label'), isOpen: tile.classList.contains('open'), left, top, right, bottom};
  }));
  return tiles.map((tile) => ({...tile, bytes: bytesOf(tile.label), area: (tile.right - tile.left) * (tile.bottom - tile.top)}));
}

function contains(outer, inner) {
  return outer !== inner && outer.left <= inner.left && outer.top <= inner.top && outer.right >= inner.right && outer.bottom >= inner.bottom;
}

test('the areas add up to the memory of the host', async () => {
  const page = await openPage(makePage(RECORDING));
  for (const moment of ['0', '3', '4']) {
    await page.fill('#slider-at', moment);
    const tiles = await tilesOf(page);
    const top = tiles.filter((tile) => !tiles.some((other) => contains(other, tile)));
    const bytes = top.reduce((sum, tile) => sum + tile.bytes, 0);
    assert.ok(Math.abs(bytes - 256 * SIZES.GB) < SIZES.GB, `${bytes} of the host`);
    const area = top.reduce((sum, tile) => sum + tile.area, 0);
    for (const tile of top) {
      assert.ok(Math.abs(tile.area / area - tile.bytes / bytes) < 0.01, `${tile.label} has ${tile.area} of ${area}`);
    }
  }
  await closePage(page);
});

// But for the names of what is open, which take some of its room.
test('small parts are no larger than they are', async () => {
  const page = await openPage(makePage(RECORDING));
  const parts = (await tilesOf(page)).filter(({isOpen, area}) => !isOpen && area > 20);
  const [area, bytes] = ['area', 'bytes'].map((each) => parts.reduce((sum, part) => sum + part[each], 0));
  assert.ok(parts.some((part) => part.right - part.left < 8));
  for (const part of parts) {
    const drawn = part.area / area / (part.bytes / bytes);
    assert.ok(drawn > 0.9 && drawn < 1.1, `${part.label} is drawn ${drawn.toFixed(2)} times as large`);
  }
  await closePage(page);
});

test('a click looks into a part, and a crumb out of it', async () => {
  const page = await openPage(makePage(RECORDING));
  await page.click('text=Last moment');
  const box = await page.locator('.treemap').boundingBox();
  await page.getByRole('button', {name: /^machines /}).click({position: {x: 12, y: 8}});
  assert.match(await page.locator('.crumbs').textContent(), /256 GBMachines and processes 104 GBmachines 102 GB$/);
  const inside = await tilesOf(page);
  const area = inside.filter((tile) => !inside.some((other) => contains(other, tile))).reduce((sum, tile) => sum + tile.area, 0);
  assert.ok(area > 0.95 * box.width * box.height);
  await page.locator('.crumbs button').first().click();
  assert.equal(await page.locator('.crumbs').textContent(), 'hypervisor.example.org 256 GB');
  await closePage(page);
});

// The services' group is called as that of the machines.
test('a click looks into the group that was clicked, not into its namesake', async () => {
  const namesakes = otherHost([/("node":"sched\/groups\/groupName","keys":\[3\].*)"services"/, '$1"machines"']);
  const page = await openPage(makePage(namesakes));
  await page.locator('.tile', {hasText: 'Machines and processes'}).click({position: {x: 12, y: 8}});
  const tiles = page.getByRole('button', {name: /^machines /});
  assert.equal(await tiles.count(), 2);
  for (const place of [0, 1]) {
    const tile = tiles.nth(place);
    const label = await tile.getAttribute('aria-label');
    await tile.focus();
    await page.keyboard.press('Enter');
    assert.equal(await page.locator('.crumbs [aria-current]').textContent(), label);
    await page.keyboard.press('Escape');
  }
  await closePage(page);
});

test('a part says what it is at the pointer', async () => {
  const page = await openPage(makePage(RECORDING));
  await page.locator('.tile', {hasText: 'db-orders'}).hover();
  assert.match(await page.locator('.where .detail').textContent(), /machines › db-orders 29\.5 GB, 11\.5 % of the host · vm-stats consumed \+ vm-stats ovhd · 257 MB of it overheads of machines$/);
  await closePage(page);
});

test('a part with more in it than it has says so, on paper, too', async () => {
  const page = await openPage(makePage(otherHost(['"otherConsumed":117170084', '"otherConsumed":58585042'])));
  const note = page.locator('.where .note');
  for (const media of ['screen', 'print']) {
    await page.emulateMedia({media});
    assert.match(await note.textContent(), /^Some memory is counted with several: what is in Machines and processes adds up to \d+ GB and is drawn at \d+\.\d % of its size, as 55\.9 GB\.$/);
    assert.ok(await note.isVisible());
  }
  await closePage(page);
  const whole = await openPage(makePage(join(build, 'hypervisor.ksi')));
  assert.equal(await whole.locator('.where .note').textContent(), '');
  await closePage(whole);
});

test('a moment whose memory is not told has no empty areas', async () => {
  const of = otherHost([/("node":"memory\/comprehensive","keys":\[\],)"value":\{[^}]*\}\}/, '$1"status":"0xbad0001"}']);
  const page = await openPage(makePageBy(ksicachePartly, of));
  assert.equal(await page.locator('.treemap').isVisible(), false);
  assert.match(await page.locator('.where .detail').textContent(), /could not be read/);
  await closePage(page);
});

test('a moment chosen in the chart moves all else', async () => {
  const page = await openPage(makePage(RECORDING));
  const chart = await page.locator('.when .chart').boundingBox();
  const x = (share) => chart.x + 52 + share * (chart.width - 52 - 26);
  await page.click('text=Last moment');
  await page.mouse.click(x(0.75), chart.y + 80);
  assert.match(await page.locator('.slider .time').first().textContent(), /10:05:00 UTC/);
  assert.match(await page.locator('.tile', {hasText: 'storage-daemon'}).textContent(), /141 GB/);
  assert.match(await page.locator('.reports p.note').textContent(), /group-stats at 2026-11-21 11:05:00/);
  assert.deepEqual(await page.locator('.changes .grid tbody tr').allTextContents(), [
    'user worldsstorage-daemon307changed189144795+144606108%', 'machinesbuild-linux1060changed143526610-7742-6%',
    'machinesmail1050changed66843776-2908-2%']);
  await closePage(page);
});

test('a span dragged in the chart is compared', async () => {
  const page = await openPage(makePage(RECORDING));
  const chart = await page.locator('.when .chart').boundingBox();
  const x = (share) => chart.x + 52 + share * (chart.width - 52 - 26);
  await page.mouse.move(x(0.5), chart.y + 80);
  await page.mouse.down();
  await page.mouse.move(x(0.6), chart.y + 80);
  await page.mouse.move(x(0.76), chart.y + 80);
  await page.mouse.up();
  const times = await page.locator('.slider .time').allTextContents();
  assert.match(times[0], /10:05:00 UTC/);
  assert.match(times[1], /10:04:00 UTC/);
  assert.match(await page.locator('.changes .note').first().textContent(), /11:04:00 .* to .*11:05:00/);
  await closePage(page);
});

test('a table is sorted, filtered, narrowed and copied', async () => {
  const page = await openPage(makePage(RECORDING), {permissions: ['clipboard-read', 'clipboard-write']});
  const reports = page.locator('.reports');
  await page.click('text=Last moment');
  await reports.locator('label:has-text("Report") select').selectOption({label: 'vm-stats'});
  await reports.locator('thead button', {hasText: /^consumed/}).click();
  assert.equal(await reports.locator('tbody th').first().textContent(), 'db-orders');
  await reports.locator('thead button', {hasText: /^consumed/}).click();
  assert.equal(await reports.locator('tbody th').first().textContent(), 'gateway');
  await reports.locator('input[type=search]').fill('web');
  assert.deepEqual(await reports.locator('tbody th').allTextContents(), ['web-03', 'web-01', 'web-02']);
  await reports.locator('summary').click();
  for (const box of await reports.locator('.columns label').all()) {
    if (!['name', 'consumed'].includes(await box.locator('b').textContent())) await box.locator('input').uncheck();
  }
  assert.deepEqual(await reports.locator('thead th').allTextContents(), ['name', 'consumed ▴']);
  await reports.locator('button', {hasText: 'Copy as CSV'}).click();
  await reports.locator('[role=status]', {hasText: '3 rows copied'}).waitFor();
  const origin = 'hypervisor.example.org,2026-11-21T10:06:00Z';
  assert.equal(await page.evaluate(() => navigator.clipboard.readText()),
    `host,time,name,consumed\n${origin},web-03,3724544\n${origin},web-01,6073352\n${origin},web-02,6073352\n`);
  await closePage(page);
});

test('a long table is shown piece by piece, and filtered, sorted and copied as a whole', async () => {
  const page = await openPage(makePage(hostWithHeaps(2500)), {permissions: ['clipboard-read', 'clipboard-write']});
  const reports = page.locator('.reports');
  const count = () => reports.locator('tbody tr').count();
  const more = reports.locator('.more');
  await reports.locator('label:has-text("Report") select').selectOption({label: 'heap-stats'});
  assert.equal(await count(), 60);
  await more.click();
  assert.equal(await count(), 1060);
  assert.match(await reports.locator('p.note').first().textContent(), /: 2514 rows, the first 1060 shown$/);
  assert.equal(await more.textContent(), 'Show 1000 more rows');
  await more.click();
  assert.equal(await more.textContent(), 'Show all 2514 rows');
  await more.click();
  assert.equal(await count(), 2514);
  assert.equal(await more.isVisible(), false);
  await reports.locator('input[type=search]').fill('heap249');
  assert.equal(await count(), 11);
  await reports.locator('thead button', {hasText: /^name/}).click();
  assert.deepEqual((await reports.locator('tbody th').allTextContents()).slice(0, 2), ['heap249', 'heap2490']);
  await reports.locator('input[type=search]').fill('');
  await reports.locator('button', {hasText: 'Copy as CSV'}).click();
  await reports.locator('[role=status]', {hasText: '2514 rows copied'}).waitFor();
  assert.equal((await page.evaluate(() => navigator.clipboard.readText())).trimEnd().split('\n').length, 2515);
  await closePage(page);
});

test('lines of what is chosen', async () => {
  const page = await openPage(makePage(RECORDING));
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  await lines.locator('select').selectOption({label: 'Processes: consumed'});
  assert.equal(await lines.locator('.lines label').nth(1).textContent(), 'storage-daemon');
  await page.click('text=Least free memory');
  assert.match(await lines.locator('.detail').textContent(), /storage-daemon 141 GB/);
  const before = await lines.locator('path.line').count();
  await lines.locator('.lines input').first().check();
  assert.equal(await lines.locator('path.line').count(), before + 1);
  await closePage(page);
});

test('columns by their names, and what they are', async () => {
  const page = await openPage(makePage(RECORDING));
  const reports = page.locator('.reports');
  const heads = () => reports.locator('thead th').allTextContents();
  await reports.locator('label:has-text("Report") select').selectOption({label: 'vm-stats'});
  const all = await heads();
  await reports.locator('summary').click();
  const names = reports.locator('.names input');
  await names.fill('NAME:consumed');
  await names.press('Enter');
  assert.deepEqual(await heads(), ['name', 'consumed']);
  assert.equal(await reports.locator('.columns input:checked').count(), 2);
  await reports.locator('.columns label:has-text("ballooned") input').check();
  assert.equal(await names.inputValue(), 'name:consumed:ballooned');
  await names.fill('name:nothing');
  await names.press('Enter');
  assert.equal(await reports.locator('.tools .note', {hasText: 'no column'}).textContent(), 'vm-stats has no column nothing');
  assert.deepEqual(await heads(), ['name', 'consumed', 'ballooned']);
  await names.fill('');
  await names.press('Enter');
  assert.deepEqual(await heads(), all);
  await reports.locator('thead button', {hasText: /^consumed/}).hover();
  assert.match(await reports.locator('.about').textContent(), /^consumed: .* \(KB\)$/);
  await closePage(page);
});

test('lines of pressure', async () => {
  const page = await openPage(makePage(RECORDING));
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  const choices = (await lines.locator('option').allTextContents()).filter((text) => /^Pressure/.test(text));
  assert.equal(choices.length, 2);
  await page.click('text=Least free memory');
  await lines.locator('select').selectOption({label: choices.find((text) => /state/.test(text))});
  assert.match(await lines.locator('.detail').textContent(), /hypervisor\.example\.org Hard$/);
  assert.equal(await lines.locator('path.line').count(), 1);
  await lines.locator('select').selectOption({label: choices.find((text) => /groups/.test(text))});
  assert.match(await lines.locator('.detail').textContent(), / 100 %$/);
  await closePage(page);
});

test('a single moment has no history', async () => {
  const page = await openPage(makePage(join(build, 'hypervisor.ksi'), '--title', 'A ticket'));
  assert.equal(await page.locator('h1').textContent(), 'A ticket');
  assert.deepEqual(await page.locator('h2').allTextContents(), ['Where the memory is', 'All reports']);
  await closePage(page);
});

test('the lower chart chooses and tells as the upper one does, and both zoom', async () => {
  const page = await openPage(makePage(RECORDING));
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  await page.click('text=Last moment');
  await lines.locator('.chart').scrollIntoViewIfNeeded();
  const {x: left, y, width} = await lines.locator('.chart').boundingBox();
  const x = (share) => left + 52 + share * (width - 52 - 26);
  const times = () => page.locator('.slider .time').allTextContents();
  await page.mouse.move(x(0.5), y + 80);
  assert.match(await lines.locator('.detail strong').textContent(), /^2026-11-21 11:04:00 /);
  await page.mouse.click(x(0.75), y + 80);
  assert.match((await times())[0], /10:05:00 UTC/);
  await page.mouse.move(x(0.25), y + 80);
  await page.mouse.down();
  await page.mouse.move(x(0.6), y + 80);
  await page.mouse.move(x(0.75), y + 80);
  await page.mouse.up();
  const chosen = await times();
  assert.match(chosen[0], /10:05:00 UTC/);
  assert.match(chosen[1], /10:03:00 UTC/);
  const places = () => page.locator('.cursor line').evaluateAll((all) => all.map((each) => Math.round(each.x1.baseVal.value)));
  const before = await places();
  await page.click('text=Zoom to the span');
  const [first, last] = [52, Math.round(width - 26)];
  assert.deepEqual(await places(), [first, last, first, last]);
  assert.ok(await page.locator('#timeline-sight').count() === 1);
  await page.click('text=Whole time');
  assert.deepEqual(await places(), before);
  await closePage(page);
});

test('what is chosen is that moment, of a long recording, too', async () => {
  const page = await openPage(makePage(reshaped(join(build, 'afternoon.rec'), '9:again')));
  const last = Number(await page.locator('#slider-at').getAttribute('max'));
  assert.ok(last < 1200);
  for (let moment = 0; moment <= last; moment += 7) {
    await page.fill('#slider-at', String(moment));
    const [, free, time] = /^(.*) of 256 GB free at (\S+ \S+)/.exec(await page.locator('.short').textContent());
    const told = await page.locator('.when .detail').textContent();
    const [stretch] = await page.locator('section:has(#lines-title) .detail strong').allTextContents();
    assert.match(stretch, /^\S+ \S+ \(.*\)( to \S+ \S+ \(.*\))?$/);
    assert.ok(told.startsWith(`${time} `) && told.includes(` Free ${free} · `), `${told} is not of ${time}, ${free} free`);
  }
  await closePage(page);
});

test('groups, which are in one another, are not added up', async () => {
  const page = await openPage(makePage(RECORDING));
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  const names = async (label) => {
    await lines.locator('select').selectOption({label});
    return lines.locator('.lines .name').allTextContents();
  };
  assert.equal((await names('Machines: consumed'))[0], 'all together');
  const groups = await names('Groups: consumed');
  assert.ok(groups.length > 5 && !groups.includes('all together'), groups.join());
  await closePage(page);
});

test('more lines than there are colours are told apart, and what is pointed at stands out', async () => {
  const page = await openPage(makePage(RECORDING));
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  await lines.locator('select').selectOption({label: 'Machines: consumed'});
  for (const box of await lines.locator('.lines input').all()) await box.check();
  const looks = () => lines.locator('path.line').evaluateAll((all) => all.map((each) => {
    const {stroke, strokeDasharray} = getComputedStyle(each);
    return `${stroke} ${strokeDasharray}`;
  }));
  assert.equal((await looks()).length, 13);
  assert.equal(new Set(await looks()).size, 13);
  await lines.locator('.lines label').nth(2).hover();
  assert.equal(await lines.locator('path.line.stressed').count(), 1);
  await lines.locator('select').selectOption({label: 'Processes: consumed'});
  await lines.locator('select').selectOption({label: 'Machines: consumed'});
  assert.equal(await lines.locator('.lines input:checked').count(), 13);
  await closePage(page);
});

test('the pointer chooses by its first button alone', async () => {
  const page = await openPage(makePage(RECORDING));
  const {x, y, width} = await page.locator('.when .chart').boundingBox();
  const before = await page.locator('.when .time').first().textContent();
  await page.mouse.click(x + width / 2, y + 80, {button: 'right'});
  assert.equal(await page.locator('.when .time').first().textContent(), before);
  assert.equal(await page.locator('.when .pointer line').count(), 1);
  await page.mouse.move(x, y + 500);
  assert.equal(await page.locator('.when .pointer line').count(), 0);
  await closePage(page);
});

test('a moment outside of what is zoomed into ends the zoom', async () => {
  const page = await openPage(makePage(RECORDING));
  const isZoomed = async () => await page.locator('button', {hasText: 'Whole time'}).getAttribute('aria-disabled') === 'false';
  await page.click('text=Zoom to the span');
  assert.equal(await isZoomed(), true);
  await page.locator('#slider-at').press('ArrowLeft');
  assert.equal(await isZoomed(), true);
  await page.click('text=Last moment');
  assert.equal(await isZoomed(), false);
  const places = await page.locator('.cursor .at').evaluateAll((all) => all.map((each) => each.x1.baseVal.value));
  const {width} = await page.locator('.when .chart').boundingBox();
  assert.ok(places.every((place) => place <= width), places.join());
  await closePage(page);
});

test('the address has what is chosen', async () => {
  const page = await openPage(makePage(RECORDING));
  await page.fill('#slider-at', '4');
  await page.fill('#slider-from', '1');
  await page.waitForFunction(() => location.hash === '#at=2026-11-21T10:06:00Z&from=2026-11-21T10:03:00Z');
  await page.reload();
  await page.waitForSelector('html[data-ready]');
  const chosen = () => page.locator('.sliders input').evaluateAll((all) => all.map((each) => each.value));
  assert.deepEqual(await chosen(), ['4', '1']);
  await page.evaluate(() => { location.hash = '#at=2026-11-21T10:04:00Z&from=<b>&x=1'; });
  await page.waitForFunction(() => document.getElementById('slider-at').value === '2');
  assert.deepEqual(await chosen(), ['2', '1']);
  // What a link leads to is seen.
  await page.click('text=Zoom to the span');
  await page.evaluate(() => { location.hash = '#at=2026-11-21T10:06:00Z'; });
  await page.waitForFunction(() => document.getElementById('slider-at').value === '4');
  assert.equal(await page.locator('button', {hasText: 'Whole time'}).getAttribute('aria-disabled'), 'true');
  await closePage(page);
});

test('moments of one second have addresses of their own', async () => {
  const page = await openPage(makePage(joined(otherHost(), ...['1', '2'].map((digit) => otherHost(['"kernelCode":24576', `"kernelCode":2457${digit}`])))));
  await page.fill('#slider-at', '2');
  await page.waitForFunction(() => location.hash === '#at=2026-11-21T10:00:00Z,3&from=2026-11-21T10:00:00Z,3');
  await page.evaluate(() => { location.hash = '#at=2026-11-21T10:00:00Z,2'; });
  await page.waitForFunction(() => document.getElementById('slider-at').value === '1');
  // Nothing grew, and so no line is there, nor figures beside it.
  const lines = page.locator('section', {has: page.locator('#lines-title')});
  assert.equal(await lines.locator('path.line').count(), 0);
  assert.equal(await lines.locator('.axis').last().textContent(), '');
  await closePage(page);
});

test('it opens at the moment with the least free memory, if that is the first one, too', async () => {
  const page = await openPage(makePage(`${RECORDING}@10:05Z..10:06Z`));
  assert.match(await page.locator('.short').textContent(), /^900 MB of 256 GB free at 2026-11-21 11:05:00 .*, the least of all\. .*11:05:00 .* to .*11:06:00/);
  assert.deepEqual(await page.locator('.sliders input').evaluateAll((all) => all.map((each) => each.value)), ['0', '1']);
  await closePage(page);
});

test('one column stays, and a filter does not outlive its report', async () => {
  const page = await openPage(makePage(RECORDING));
  const reports = page.locator('.reports');
  await reports.locator('label:has-text("Report") select').selectOption({label: 'vm-stats'});
  await reports.locator('summary').click();
  const names = reports.locator('.names input');
  await names.fill('name');
  await names.press('Enter');
  await reports.locator('.columns input:checked').click();
  assert.deepEqual(await reports.locator('thead th').allTextContents(), ['name']);
  assert.equal(await reports.locator('.columns input:checked').count(), 1);
  assert.equal(await reports.locator('[role=status]', {hasText: 'One column stays'}).count(), 1);
  await reports.locator('input[type=search]').fill('db-');
  assert.equal(await reports.locator('[role=status]', {hasText: 'of 12 rows'}).textContent(), '2 of 12 rows');
  await reports.locator('label:has-text("Report") select').selectOption({label: 'heap-stats'});
  assert.equal(await reports.locator('input[type=search]').inputValue(), '');
  assert.equal(await reports.locator('tbody tr').count(), 14);
  await closePage(page);
});

// The group of the machines is in one of them.
test('groups in a ring are not left out', async () => {
  const page = await openPage(makePage(otherHost([/("node":"sched\/groups\/parentGroupID","keys":\[4\],"value":\{"parentGroupID":)\d+/, '$11000'])));
  const labels = await page.locator('.tile').evaluateAll((all) => all.map((tile) => tile.getAttribute('aria-label')));
  for (const name of ['db-orders', 'mail', 'web-01']) assert.ok(labels.some((label) => label.startsWith(`${name} `)), labels.join());
  await closePage(page);
});

test('tables say their unit, and changes the part of the growth', async () => {
  const page = await openPage(makePage(RECORDING), {permissions: ['clipboard-read', 'clipboard-write']});
  const note = page.locator('.reports p.note').first();
  assert.match(await note.textContent(), /, memory in KB: \d+ rows$/);
  await page.selectOption('.reports label:has-text("Memory in") select', 'mb');
  assert.match(await note.textContent(), /, memory in MB: \d+ rows$/);
  const changes = page.locator('.changes');
  await changes.locator('button', {hasText: 'Copy as CSV'}).click();
  await changes.locator('[role=status]', {hasText: 'rows copied'}).waitFor();
  const lead = 'hypervisor.example.org,2026-11-21T10:02:00Z,2026-11-21T10:05:00Z,MB';
  assert.equal(await page.evaluate(() => navigator.clipboard.readText()), `host,from,to,unit,what,name,group,state,before,after,growth,part
${lead},user worlds,storage-daemon,307,changed,189,144795,144606,108.0
${lead},machines,build-linux,1060,changed,14352,6610,-7742,-5.8
${lead},machines,mail,1050,changed,6684,3776,-2908,-2.2
`);
  await changes.locator('thead button', {hasText: /^growth/}).click();
  assert.deepEqual(await changes.locator('.grid tbody td:nth-child(7)').allTextContents(), ['+144606', '-2908', '-7742']);
  await closePage(page);
});
