// Figures and names as they are shown.
import {Kind} from './tables.js';

export const NO_VALUE = '–';

const LONGEST = 100; // characters

// The units of memory by the words of -u, with their titles and the bits of a byte's count that
// they drop.
export const UNITS = {
  mb: {title: 'MB', shift: 20},
  kb: {title: 'KB', shift: 10},
  pg: {title: 'Page (4K)', shift: 12},
  b: {title: 'Bytes', shift: 0},
};

const SHIFTS = new Map(Object.values(UNITS).map(({title, shift}) => [title, shift]));

export function isMemory(column) {
  return SHIFTS.has(column.unit);
}

// A figure of memory in another unit, as `ksicache export` has it: fractions are dropped, and what
// is too large for 64 bits has no value.
export function converted(value, column, unit) {
  const shift = SHIFTS.get(column.unit) - UNITS[unit].shift;
  if (shift === 0) return value;
  const whole = BigInt(value);
  const result = shift < 0 ? whole >> BigInt(-shift) : whole << BigInt(shift);
  const held = column.isSigned ? BigInt.asIntN(64, result) : BigInt.asUintN(64, result);
  return held === result ? result : null;
}

// Memory in bytes, to draw; null if it has no value.
export function bytesOf(value, column) {
  return typeof value === 'number' || typeof value === 'bigint'
    ? Number(value) * 2 ** SHIFTS.get(column.unit) : null;
}

// What hides, or turns the direction of what is around it, is written out.
const HIDDEN = /[\u0000-\u001f\u007f-\u00a0\u00ad\u034f\u061c\u115f\u1160\u17b4\u17b5\u180b-\u180f\u200b-\u200f\u2028-\u202f\u205f-\u206f\u2800\u3000\u3164\ufe00-\ufe0f\ufeff\uffa0\ufff0-\uffff]|[\ud800-\udbff](?![\udc00-\udfff])|(?<![\ud800-\udbff])[\udc00-\udfff]|[\u{1d173}-\u{1d17a}\u{e0000}-\u{e0fff}]/gu;

// As its bytes, "\xe2\x80\xae", which is how the command line shows it.
function escape(character) {
  return [...new TextEncoder().encode(character)].map((byte) => `\\x${byte.toString(16).padStart(2, '0')}`).join('');
}

// A text of a capture as it is shown.
export function shownText(text) {
  return text.replace(HIDDEN, escape);
}

// As much of a name as says what it is, where the whole of it stands elsewhere.
export function shortText(name) {
  return name.length > LONGEST ? `${name.slice(0, LONGEST)}…` : name;
}

// A value in the unit that is chosen, as text.
export function shownValue(value, column, unit) {
  if (value === null) return NO_VALUE;
  if (column.kind === Kind.text) return shownText(value);
  if (column.kind === Kind.flag) return value ? 'y' : 'n';
  const shown = unit !== null && isMemory(column) ? converted(value, column, unit) : value;
  return shown === null ? NO_VALUE : String(shown);
}

const NAMES = ['bytes', 'KB', 'MB', 'GB', 'TB', 'PB'];

// Memory for people: three digits and a unit.
export function memoryText(bytes) {
  if (bytes === null) return NO_VALUE;
  if (bytes === 0) return '0';
  let size = Math.abs(bytes);
  let name = 0;
  while (size >= 999.5 && name + 1 < NAMES.length) {
    size /= 1024;
    ++name;
  }
  const digits = name === 0 || size >= 99.95 ? 0 : size >= 9.995 ? 1 : 2;
  return `${bytes < 0 ? '−' : ''}${size.toFixed(digits)} ${NAMES[name]}`;
}

// The same without digits that say nothing.
export function tickText(bytes) {
  return memoryText(bytes).replace(/\.0+ /, ' ');
}

// By how much something has more, in the unit that is chosen.
export function signedText(number) {
  return number === null ? NO_VALUE : number > 0n ? `+${number}` : String(number);
}

export function percentText(part, whole) {
  return whole > 0 ? `${(100 * part / whole).toFixed(1)} %` : NO_VALUE;
}
