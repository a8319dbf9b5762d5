// A page that is not as it was made says so.
import assert from 'node:assert/strict';
import {readFileSync, writeFileSync} from 'node:fs';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, makePage, openPage, scratch} from './browser.js';

const PAGE = readFileSync(makePage(join(build, 'incident.rec')), 'utf8');

async function openDamaged(text, options = {}) {
  const name = join(scratch, 'damaged.html');
  writeFileSync(name, text);
  return openPage(name, {isWhole: false, ...options});
}

async function expectAlarm(text, options) {
  const page = await openDamaged(text, options);
  const alarm = page.locator('#damaged');
  await alarm.waitFor({state: 'visible'});
  assert.match(await alarm.textContent(), /^This page is damaged or was cut off/);
  assert.equal(await page.locator('#summary').isVisible(), true);
  await page.context().close();
}

test('a page that was cut off', async () => {
  const cuts = [PAGE.indexOf('id="points"'), PAGE.indexOf('id="tables"') + 1000, PAGE.lastIndexOf('<script>') + 100];
  for (const cut of cuts) {
    await expectAlarm(PAGE.slice(0, cut));
    await expectAlarm(PAGE.slice(0, cut), {javaScriptEnabled: false});
  }
});

test('data that is not as it was made', async () => {
  for (const id of ['head', 'points', 'tables', 'lines']) {
    const at = PAGE.indexOf(`id="${id}"`) + 60;
    await expectAlarm(`${PAGE.slice(0, at)}AAAAAAAA${PAGE.slice(at + 8)}`);
    await expectAlarm(`${PAGE.slice(0, at)}<${PAGE.slice(at + 1)}`);
  }
});

test('a whole page says nothing of it', async () => {
  const page = await openDamaged(PAGE, {isWhole: true});
  assert.equal(await page.locator('#damaged').count(), 0);
  await page.context().close();
  const still = await openDamaged(PAGE, {javaScriptEnabled: false});
  assert.equal(await still.locator('#damaged').isVisible(), false);
  await still.context().close();
});
