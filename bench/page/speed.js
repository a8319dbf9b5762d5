// speed.js PAGE.html: how long Chromium takes to show a page, and for each choice of a moment.
//
// Prints a line for each figure: its name, the figure and the unit. It takes what tests/page does.
import {statSync} from 'node:fs';
import {browser, closePage, openPage} from '../../tests/page/chromium.js';

const CHOICES = 40;

const name = process.argv[2];
const page = await openPage(name);

function row(what, figure, unit) {
  console.log(`${what.padEnd(36)} ${figure.toFixed(2).padStart(10)} ${unit}`);
}

const paints = await page.evaluate(() => performance.getEntriesByType('paint').map((each) => each.startTime));
const shown = await page.evaluate(() => performance.getEntriesByName('shown')[0]?.startTime ?? NaN);

// Each choice until the browser has laid out what it changed.
const choices = await page.evaluate((most) => {
  const slider = document.getElementById('slider-at');
  if (slider === null) return [];
  const moments = Number(slider.max) + 1;
  return Array.from({length: most}, (_, i) => {
    const begin = performance.now();
    slider.value = String(Math.floor((i * 7919) % moments));
    slider.dispatchEvent(new Event('input'));
    document.body.getBoundingClientRect();
    return performance.now() - begin;
  });
}, CHOICES);

row('size', statSync(name).size / 1e6, 'MB');
row('first paint', Math.min(...paints), 'ms');
row('all shown', shown, 'ms');
if (choices.length > 0) {
  choices.sort((a, b) => a - b);
  row('choice of a moment, half of them', choices[CHOICES / 2], 'ms');
  row('  at most', choices[CHOICES - 1], 'ms');
}
await closePage(page);
await browser.close();
