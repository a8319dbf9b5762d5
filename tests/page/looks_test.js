// The page looks as in the kept pictures, within a tolerance, and reads without scripts.
import assert from 'node:assert/strict';
import {existsSync, readFileSync, writeFileSync} from 'node:fs';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, makePage, openPage} from './browser.js';

const RECORDING = join(build, 'incident.rec');

// Fonts differ from machine to machine: pictures are compared as areas of so many pixels.
const BLOCK = 16;
const FAR = 24; // of 255, how much a block may differ
const MOST = 0.01; // of all blocks may differ more

// The mean colors of the blocks of a picture, and its size, by the browser's own decoder.
async function blocksOf(page, picture) {
  return page.evaluate(async ({url, block}) => {
    const image = new Image();
    image.src = url;
    await image.decode();
    const width = Math.ceil(image.width / block);
    const height = Math.ceil(image.height / block);
    const canvas = new OffscreenCanvas(width, height);
    const context = canvas.getContext('2d');
    context.imageSmoothingQuality = 'high';
    context.drawImage(image, 0, 0, image.width, image.height, 0, 0, width, height);
    return {width, height, data: [...context.getImageData(0, 0, width, height).data]};
  }, {url: `data:image/png;base64,${picture.toString('base64')}`, block: BLOCK});
}

function differing(a, b) {
  let count = 0;
  for (let at = 0; at < a.data.length; at += 4) {
    if ([0, 1, 2].some((i) => Math.abs(a.data[at + i] - b.data[at + i]) > FAR)) ++count;
  }
  return count / (a.data.length / 4);
}

// By their pictures; that of the README is one of them.
const LOOKS = {
  'pictures/wide.png': {},
  'pictures/dark.png': {colorScheme: 'dark'},
  'pictures/narrow.png': {viewport: {width: 360, height: 780}},
  'pictures/still.png': {javaScriptEnabled: false},
  '../../docs/page.png': {of: 'afternoon.rec', timezoneId: 'UTC', viewport: {width: 1120, height: 1200}},
};

async function pictureOf(page) {
  await page.evaluate(() => document.fonts.ready);
  return page.screenshot({animations: 'disabled'});
}

for (const [name, {of = 'incident.rec', ...options}] of Object.entries(LOOKS)) {
  test(`looks as kept: ${name}`, async () => {
    const page = await openPage(makePage(join(build, of)), options);
    const picture = await pictureOf(page);
    const kept = new URL(name, import.meta.url);
    if (process.env.UPDATE === '--update') writeFileSync(kept, picture);
    assert.ok(existsSync(kept), `${kept} is missing`);
    const judge = await openPage(makePage(RECORDING), {bypassCSP: true});
    const [now, before] = [await blocksOf(judge, picture), await blocksOf(judge, readFileSync(kept))];
    assert.deepEqual([now.width, now.height], [before.width, before.height]);
    assert.ok(differing(now, before) <= MOST, `${(100 * differing(now, before)).toFixed(1)} % of it differ`);
    await judge.context().close();
    await closePage(page);
  });
}

test('reads without scripts', async () => {
  const page = await openPage(makePage(RECORDING), {javaScriptEnabled: false});
  assert.equal(await page.locator('h1').textContent(), 'hypervisor.example.org');
  assert.match(await page.locator('main > p').first().textContent(), /2026-11-21T10:02:00Z to 2026-11-21T10:06:00Z/);
  assert.match(await page.locator('table').first().textContent(), /Free9000\.3.*Total262144100\.0/);
  assert.match(await page.locator('table').nth(1).textContent(), /db-orders29949/);
  await closePage(page);
});

test('nothing lies outside of a narrow screen', async () => {
  const page = await openPage(makePage(RECORDING), {viewport: {width: 360, height: 780}});
  assert.equal(await page.evaluate(() => document.documentElement.scrollWidth), 360);
  await closePage(page);
});
