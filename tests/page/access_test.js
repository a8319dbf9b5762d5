// axe-core finds nothing, whatever is chosen, and all can be done by the keyboard.
import assert from 'node:assert/strict';
import {readFileSync} from 'node:fs';
import {createRequire} from 'node:module';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, makePage, openPage} from './browser.js';

const RECORDING = join(build, 'incident.rec');
const AXE = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');

async function violations(page, rules = {}) {
  await page.evaluate(AXE);
  const found = await page.evaluate((options) => axe.run(options), rules);
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

test('axe-core: in the dark', async () => {
  const page = await openPage(makePage(RECORDING), {colorScheme: 'dark'});
  assert.deepEqual(await violations(page, {runOnly: ['color-contrast']}), []);
  await closePage(page);
});

test('axe-core: on a narrow screen', async () => {
  const page = await openPage(makePage(RECORDING), {viewport: {width: 360, height: 780}});
  assert.deepEqual(await violations(page), []);
  await closePage(page);
});

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
  await closePage(page);
});

test('a moment by the keyboard', async () => {
  const page = await openPage(makePage(RECORDING));
  await page.click('text=Last moment');
  await page.focus('#slider-at');
  await page.keyboard.press('ArrowLeft');
  assert.match(await page.locator('.slider output').first().textContent(), /^2026-11-21 11:05:00 \(10:05:00 UTC\)$/);
  assert.match(await page.locator('.when .detail').textContent(), /Free 900 MB .*memory state Hard/);
  await closePage(page);
});
