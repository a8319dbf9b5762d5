// axe-core finds nothing, whatever is chosen, and all can be done by the keyboard.
import assert from 'node:assert/strict';
import {readFileSync} from 'node:fs';
import {createRequire} from 'node:module';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, hostWithHeaps, joined, ksicache, makePage, openPage, scratch} from './browser.js';

const RECORDING = join(build, 'incident.rec');
const AXE = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');

async function violations(page) {
  await page.evaluate(AXE);
  const found = await page.evaluate(() => axe.run({rules: {'target-size': {enabled: true}}}));
  return found.violations.map(({id, nodes}) => `${id}: ${nodes[0].html} ${nodes[0].failureSummary}`);
}

test('axe-core: a recording, as it opens and with all that can be opened', async () => {
  const page = await openPage(makePage(RECORDING));
  assert.deepEqual(await violations(page), []);
  await page.click('text=Least free memory');
  await page.click('summary:has-text("Columns")');
  await page.locator('.tile.open').last().click({position: {x: 12, y: 8}});
  assert.deepEqual(await violations(page), []);
  await closePage(page);
});

// Two moments, the first of which has long tables.
function recordingWithHeaps() {
  const after = join(scratch, 'after.ksi');
  ksicache('extract', '--force', `${RECORDING}@10:05Z`, after);
  return joined(hostWithHeaps(100), after);
}

// By the keyboard alone: looks into a part, opens the columns, sorts a table and shows all of it.
async function openAll(page) {
  const enter = async (what) => {
    await what.focus();
    await page.keyboard.press('Enter');
  };
  await enter(page.locator('button', {hasText: 'First moment'}));
  await enter(page.locator('.tile', {hasText: 'Machines and processes'}));
  await page.selectOption('.reports label:has-text("Report") select', {label: 'heap-stats'});
  await enter(page.locator('summary:has-text("Columns")'));
  await enter(page.locator('.reports thead button').nth(1));
  await enter(page.locator('.reports .more'));
  assert.equal(await page.locator('.reports tbody tr').count(), 114);
  await enter(page.locator('.changes thead button').nth(3));
  assert.match(await page.locator('.changes .about').textContent(), /^state: /);
  assert.equal(await page.locator('.crumbs li').count(), 2);
  assert.equal(await page.locator('.reports .columns input').first().isVisible(), true);
}

for (const colorScheme of ['light', 'dark']) {
  for (const width of [360, 1280]) {
    test(`axe-core: ${colorScheme}, ${width} pixels wide, with all that the keyboard opens`, async () => {
      const page = await openPage(makePage(recordingWithHeaps()), {colorScheme, viewport: {width, height: 780}});
      assert.deepEqual(await violations(page), []);
      await openAll(page);
      assert.deepEqual(await violations(page), []);
      await closePage(page);
    });
  }
}

test('axe-core: a single moment', async () => {
  const page = await openPage(makePage(join(build, 'hypervisor.ksi')));
  assert.deepEqual(await violations(page), []);
  await closePage(page);
});

async function focused(page) {
  return page.evaluate(() => document.activeElement.getAttribute('aria-label') ?? document.activeElement.textContent);
}

test('the treemap by the keyboard', async () => {
  const page = await openPage(makePage(join(build, 'hypervisor.ksi')));
  await page.locator('.tile[tabindex="0"]').focus();
  const first = await focused(page);
  await page.keyboard.press('ArrowRight');
  assert.notEqual(await focused(page), first);
  await page.locator('.tile', {hasText: 'Machines and processes'}).focus();
  assert.match(await page.locator('.where .detail').textContent(), /Machines and processes .* comp-stats otherConsumed/);
  await page.keyboard.press('Enter');
  assert.equal(await page.locator('.crumbs [aria-current]').textContent(), 'Machines and processes 112 GB');
  assert.equal(await page.evaluate(() => document.activeElement.className.includes('tile')), true);
  await page.keyboard.press('Escape');
  assert.equal(await page.locator('.crumbs [aria-current]').textContent(), 'hypervisor.example.org 256 GB');
  const labels = await page.locator('.tile').evaluateAll((all) => all.map((tile) => tile.getAttribute('aria-label')));
  await page.keyboard.press('End');
  assert.equal(await focused(page), labels.at(-1));
  await page.keyboard.press('Home');
  assert.equal(await focused(page), labels[0]);
  await closePage(page);
});

test('a moment by the keyboard', async () => {
  const page = await openPage(makePage(RECORDING));
  await page.click('text=Last moment');
  await page.focus('#slider-at');
  await page.keyboard.press('ArrowLeft');
  assert.match(await page.locator('.slider .time').first().textContent(), /^2026-11-21 11:05:00 \(10:05:00 UTC\)$/);
  assert.match(await page.locator('.when .detail').textContent(), /Free 900 MB .*memory state Hard/);
  await closePage(page);
});

test('what a column is, by a touch', async () => {
  const page = await openPage(makePage(RECORDING), {hasTouch: true});
  await page.locator('.reports thead button').nth(2).tap();
  const name = (await page.locator('.reports thead button').nth(2).textContent()).replace(/ .*/, '');
  assert.match(await page.locator('.reports .about').textContent(), new RegExp(`^${name}: .`));
  await closePage(page);
});

// By the formula of WCAG 2.
function luminance(rgb) {
  const [r, g, b] = rgb.match(/\d+/g).slice(0, 3).map((each) => each / 255).map((each) => (each <= 0.04045 ? each / 12.92 : ((each + 0.055) / 1.055) ** 2.4));
  return 0.2126 * r + 0.7152 * g + 0.0722 * b;
}

function contrast(a, b) {
  const [dark, light] = [luminance(a), luminance(b)].sort((x, y) => x - y);
  return (light + 0.05) / (dark + 0.05);
}

for (const colorScheme of ['light', 'dark']) {
  test(`lines tell areas apart: ${colorScheme}`, async () => {
    const page = await openPage(makePage(RECORDING), {colorScheme});
    const {areas, tiles, ground} = await page.evaluate(() => {
      const stylesOf = (name, pick) => [...document.querySelectorAll(name)].map((each) => pick(getComputedStyle(each)));
      return {
        areas: stylesOf('.area', ({fill, stroke}) => [fill, stroke]),
        tiles: stylesOf('.tile', ({backgroundColor, boxShadow}) => [backgroundColor, boxShadow]),
        ground: getComputedStyle(document.body).backgroundColor,
      };
    });
    assert.ok(areas.length >= 6 && tiles.length >= 6);
    for (const [fill, line] of [...areas, ...tiles]) {
      assert.notEqual(line, 'none');
      assert.ok(contrast(fill, line) > 2.5, `${fill} beside ${line}: ${contrast(fill, line)}`);
      assert.ok(contrast(ground, line) > 3, `${line} on ${ground}`);
    }
    await closePage(page);
  });
}

function focusedTile(page) {
  return page.evaluate(() => (document.activeElement.classList.contains('tile') ? document.activeElement.querySelector('.name').textContent : document.activeElement.tagName));
}

test('the focus stays with what has it', async () => {
  const page = await openPage(makePage(RECORDING));
  const enter = async (text) => {
    await page.locator('button', {hasText: text}).focus();
    await page.keyboard.press('Enter');
    return page.evaluate(() => document.activeElement.textContent);
  };
  assert.equal(await enter('Zoom to the span'), 'Zoom to the span');
  assert.equal(await enter('Whole time'), 'Whole time');
  assert.equal(await enter('Whole time'), 'Whole time');
  await page.locator('.tile', {hasText: 'db-orders'}).focus();
  await page.setViewportSize({width: 1000, height: 900});
  await page.waitForFunction(() => document.querySelector('.treemap').clientWidth < 1000);
  await page.evaluate(() => new Promise((done) => { requestAnimationFrame(() => requestAnimationFrame(done)); }));
  assert.equal(await focusedTile(page), 'db-orders');
  await page.evaluate(() => { document.getElementById('slider-at').value = 0; document.getElementById('slider-at').dispatchEvent(new Event('input')); });
  assert.equal(await focusedTile(page), 'db-orders');
  // What has nothing in it is seen in what it is in; back out of that, this has the focus.
  await page.keyboard.press('Enter');
  assert.equal(await page.locator('.crumbs [aria-current]').textContent(), 'machines 110 GB');
  assert.equal(await focusedTile(page), 'db-orders');
  await page.keyboard.press('Escape');
  assert.equal(await focusedTile(page), 'machines');
  await page.keyboard.press('Escape');
  assert.equal(await focusedTile(page), 'Machines and processes');
  await closePage(page);
});

// Who hears the page hears of a choice what is free then, once, and of a filter how many rows it finds.
test('only what is asked for is spoken', async () => {
  const page = await openPage(makePage(RECORDING));
  await page.evaluate(() => {
    const live = [...document.querySelectorAll('[role=status], [role=alert], [aria-live], output')];
    window.spoken = [];
    for (const each of live) {
      new MutationObserver(() => window.spoken.push(each.className)).observe(each, {childList: true, characterData: true, subtree: true});
    }
  });
  const spoken = () => page.evaluate(() => window.spoken.splice(0));
  await page.locator('#slider-at').press('ArrowLeft');
  assert.deepEqual(await spoken(), ['short']);
  await page.locator('.tile', {hasText: 'mail'}).focus();
  assert.deepEqual(await spoken(), []);
  assert.equal(await page.evaluate(() => document.getElementById(document.activeElement.getAttribute('aria-describedby')).textContent.includes('vm-stats consumed')), true);
  await page.locator('.reports input[type=search]').fill('mail');
  assert.deepEqual(await spoken(), ['note']);
  await closePage(page);
});

test('with the colours of the reader the keys of pictures keep theirs', async () => {
  const page = await openPage(makePage(RECORDING), {forcedColors: 'active'});
  const looks = await page.evaluate(() => ['.swatch.free', '.tile', '.key .color0'].map((name) => {
    const {backgroundColor, boxShadow, stroke} = getComputedStyle(document.querySelector(name));
    return [backgroundColor, boxShadow === 'none', stroke];
  }));
  assert.deepEqual(looks, [['rgb(228, 235, 230)', true, 'none'], ['rgb(240, 207, 160)', false, 'none'], ['rgba(0, 0, 0, 0)', true, 'rgb(43, 108, 176)']]);
  await closePage(page);
});
