// Times as they are shown: us since 1970, for the reader and for the host.

function formatter(timeZone, options = {}) {
  return new Intl.DateTimeFormat('sv-SE', {
    year: 'numeric', month: '2-digit', day: '2-digit', hour: '2-digit', minute: '2-digit',
    second: '2-digit', timeZone, ...options,
  });
}

const UTC = 'UTC';
const LOCAL = formatter(undefined);

// Zones of one name have one time, and so have all names of UTC.
function zoneOf(format) {
  const {timeZone} = format.resolvedOptions();
  return ['Etc/UTC', 'GMT', 'Etc/GMT'].includes(timeZone) ? UTC : timeZone;
}

const READER = zoneOf(LOCAL);

// What stands beside the reader's times: those of the host where its zone is told and another one,
// else UTC, which reports and the command line have.
let beside = {zone: UTC, format: formatter(UTC)};
let ofHost = 'the time zone of the host is not recorded';

// Takes the host's zone; an empty one is not told.
export function setHostZone(told) {
  if (told === '') return;
  try {
    const format = formatter(told, {timeZoneName: 'longOffset'});
    const zone = zoneOf(format);
    if (zone !== READER && zone !== UTC) beside = {zone: told, format};
    ofHost = `the host is in ${told}`;
  } catch {
    ofHost = `this browser does not know ${told}, the time zone of the host`;
  }
}

// Which zones the times are of.
export function zoneText() {
  const others = beside.zone === UTC ? 'UTC, which the reports have,' : `those of ${beside.zone}`;
  const zones = beside.zone === READER ? 'Times are in UTC, as in the reports'
    : `Times are those of ${READER}, where this page is read, with ${others} beside them`;
  return `${zones}; ${ofHost}.`;
}

function clock(text) {
  return text.slice(11);
}

// "19:05:00 GMT+09:00" as "19:05:00 +09:00"
function withOffset(text) {
  return text.replace(/ GMT$/, ' +00:00').replace(' GMT', ' ').replace('\u2212', '-');
}

// "2026-11-21 11:05:00 (10:05:00 UTC)", "2026-11-21 11:05:00 (host: 19:05:00 +09:00)"
export function timeText(time) {
  const date = new Date(time / 1000);
  const ofReader = LOCAL.format(date);
  if (beside.zone === READER) return `${ofReader} ${UTC}`;
  const other = beside.format.format(date);
  const text = ofReader.slice(0, 10) === other.slice(0, 10) ? clock(other) : other;
  return `${ofReader} (${beside.zone === UTC ? `${text} ${UTC}` : `host: ${withOffset(text)}`})`;
}

// As `ksicache export` writes it: to the second.
export function isoText(time) {
  return `${new Date(Math.floor(time / 1e6) * 1000).toISOString().slice(0, 19)}Z`;
}

// How long, us: "1 d 2 h", "5 min", "30 s"
export function spanText(time) {
  const seconds = Math.round(Math.abs(time) / 1e6);
  const units = [['d', 86400], ['h', 3600], ['min', 60], ['s', 1]];
  const first = units.findIndex(([, size]) => seconds >= size);
  if (first < 0) return '0 s';
  let rest = seconds;
  const words = [];
  for (const [name, size] of units.slice(first, first + 2)) {
    const count = Math.floor(rest / size);
    if (count > 0) words.push(`${count} ${name}`);
    rest -= count * size;
  }
  return words.join(' ');
}
