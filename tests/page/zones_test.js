// Times are the reader's, with those of the host, or else UTC, beside them.
import assert from 'node:assert/strict';
import {join} from 'node:path';
import {test} from 'node:test';
import {build, closePage, makePage, openPage, reshaped} from './browser.js';

const INCIDENT = join(build, 'incident.rec'); // 2026-11-21, from 10:02 UTC on

function zoneOf(page) {
  return page.locator('header .note').first().textContent();
}

for (const {reader, zone, time, said} of [
  {reader: 'Europe/Berlin', time: '2026-11-21 11:02:00 (10:02:00 UTC)',
    said: 'Times are those of Europe/Berlin, where this page is read, with UTC, which the reports have, beside them; the time zone of the host is not recorded.'},
  {reader: 'UTC', time: '2026-11-21 10:02:00 UTC',
    said: 'Times are in UTC, as in the reports; the time zone of the host is not recorded.'},
  {reader: 'UTC', zone: 'Etc/UTC', time: '2026-11-21 10:02:00 UTC',
    said: 'Times are in UTC, as in the reports; the host is in Etc/UTC.'},
  {reader: 'UTC', zone: 'Asia/Tokyo', time: '2026-11-21 10:02:00 (host: 19:02:00 +09:00)',
    said: 'Times are those of UTC, where this page is read, with those of Asia/Tokyo beside them; the host is in Asia/Tokyo.'},
  {reader: 'Europe/Berlin', zone: 'Asia/Tokyo', time: '2026-11-21 11:02:00 (host: 19:02:00 +09:00)',
    said: 'Times are those of Europe/Berlin, where this page is read, with those of Asia/Tokyo beside them; the host is in Asia/Tokyo.'},
  {reader: 'Europe/Berlin', zone: 'Europe/Berlin', time: '2026-11-21 11:02:00 (10:02:00 UTC)',
    said: 'Times are those of Europe/Berlin, where this page is read, with UTC, which the reports have, beside them; the host is in Europe/Berlin.'},
  {reader: 'Europe/Berlin', zone: 'UTC', time: '2026-11-21 11:02:00 (10:02:00 UTC)',
    said: 'Times are those of Europe/Berlin, where this page is read, with UTC, which the reports have, beside them; the host is in UTC.'},
  {reader: 'Pacific/Auckland', zone: 'America/St_Johns', time: '2026-11-21 23:02:00 (host: 06:32:00 -03:30)',
    said: 'Times are those of Pacific/Auckland, where this page is read, with those of America/St_Johns beside them; the host is in America/St_Johns.'},
  {reader: 'Pacific/Kiritimati', zone: 'Pacific/Honolulu', time: '2026-11-22 00:02:00 (host: 2026-11-21 00:02:00 -10:00)',
    said: 'Times are those of Pacific/Kiritimati, where this page is read, with those of Pacific/Honolulu beside them; the host is in Pacific/Honolulu.'},
]) {
  test(`read in ${reader}, of a host in ${zone ?? 'an unknown zone'}`, async () => {
    const page = await openPage(makePage(INCIDENT, ...(zone === undefined ? [] : ['--zone', zone])), {timezoneId: reader});
    await page.click('text=First moment');
    assert.equal(await page.locator('.when .time').first().textContent(), time);
    assert.ok((await zoneOf(page)).endsWith(` ${said}`), await zoneOf(page));
    await closePage(page);
  });
}

// Half an hour before clocks went back there, and half an hour after.
test('a host that leaves summer time', async () => {
  const recording = reshaped(INCIDENT, '0:clock:-2367120', '1:gap:3600');
  const page = await openPage(makePage(recording, '--zone', 'Europe/London'));
  const time = () => page.locator('.when .time').first().textContent();
  await page.click('text=First moment');
  assert.equal(await time(), '2026-10-25 02:30:00 (host: 01:30:00 +01:00)');
  await page.locator('#slider-at').press('ArrowRight');
  assert.equal(await time(), '2026-10-25 02:31:00 (host: 01:31:00 +00:00)');
  await closePage(page);
});

test('a zone that the browser does not know, and one by its other name', async () => {
  const page = await openPage(makePage(INCIDENT));
  const told = (zone) => page.evaluate((name) => {
    module_times.setHostZone(name);
    return [module_times.zoneText(), module_times.timeText(0)];
  }, zone);
  assert.deepEqual(await told('Nowhere/Else'), [
    'Times are those of Europe/Berlin, where this page is read, with UTC, which the reports have, beside them; this browser does not know Nowhere/Else, the time zone of the host.',
    '1970-01-01 01:00:00 (00:00:00 UTC)']);
  assert.deepEqual(await told('Europe/Kyiv'), [
    'Times are those of Europe/Berlin, where this page is read, with those of Europe/Kyiv beside them; the host is in Europe/Kyiv.',
    '1970-01-01 01:00:00 (host: 03:00:00 +03:00)']);
  await closePage(page);
});
