// What the page says in short: who explains it, what things are called, and what is left of a part.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, ksicache, makePage, openPage, otherHost} from './browser.js';

const INCIDENT = join(build, 'incident.rec');
const MOMENTS = ['10:02', '10:03', '10:04', '10:05', '10:06'];

// Those who explain most of what is more or less in use, as `ksicache diff` has it.
function explained(from, to) {
  const diff = JSON.parse(ksicache('diff', '--json', '--top', '1000', '--unit', 'mb', `${INCIDENT}@${from}Z`, `${INCIDENT}@${to}Z`));
  const added = diff.parts.filter((part) => part.added);
  const heaps = added.find((part) => part.what === 'heaps');
  const all = [
    {name: 'caches', growth: diff.host.caches.growth},
    {name: 'the kernel outside of heaps', growth: diff.host.kernel.growth - heaps.growth},
    ...added.flatMap((part) => part.rows),
  ];
  const changed = all.filter(({growth}) => growth !== 0).sort((a, b) => Math.abs(b.growth) - Math.abs(a.growth));
  const words = (things, most) => things.slice(0, most).map(({name, growth}) => `${name} ${growth > 0 ? '+' : ''}${growth} MB`).join(', ');
  const isSame = ({growth}) => growth > 0 === diff.host.used.growth > 0;
  const other = words(changed.filter((each) => !isSame(each)), 1);
  return `${words(changed.filter(isSame), 3)}${other === '' ? '' : `; the other way ${other}`}`;
}

test('who explains it goes by the chosen moments', async () => {
  const page = await openPage(makePage(INCIDENT));
  const short = page.locator('.short');
  assert.match(await short.textContent(), /^\d+ MB of 256 GB free at .*10:05:00 UTC\), the least of all\. /);
  for (const [from, at] of [[0, 3], [0, 4], [1, 2], [3, 4]]) {
    await page.locator('#slider-from').fill(String(from));
    await page.locator('#slider-at').fill(String(at));
    const who = explained(MOMENTS[from], MOMENTS[at]);
    assert.ok((await short.textContent()).endsWith(`: ${who}.`), `${await short.textContent()} is not of ${who}`);
  }
  await closePage(page);
});

test('namesakes have their numbers', async () => {
  const page = await openPage(makePage(otherHost([/("node":"sched\/groups\/groupName","keys":\[1060\].*)"build-linux"/, '$1"db-orders"'])));
  const labels = await page.locator('.tile').evaluateAll((tiles) => tiles.map((tile) => tile.getAttribute('aria-label')));
  const named = labels.map((label) => /^db-orders( \d+)? \S+ [GM]B$/.exec(label)?.[1]).filter((number) => number !== undefined);
  assert.deepEqual(named.sort(), [' 1000', ' 1060']);
  assert.ok(labels.some((label) => /^web-01 \S+ [GM]B$/.test(label)));
  await closePage(page);
});

test('what is left of a part is told', async () => {
  const page = await openPage(makePage(join(build, 'hypervisor.ksi')));
  await page.locator('.tile', {hasText: 'Machines and processes'}).hover({position: {x: 12, y: 8}});
  assert.match(await page.locator('.where .detail').textContent(), / · \d+ MB of it: not told apart$/);
  await closePage(page);
});
