// The head of the page: whose memory, when, and in short what there is to see.
import {markText} from './chart.js';
import {compared} from './comparison.js';
import {element} from './dom.js';
import {ZONE, growthText, isUtc, memoryText, shownText, spanText, timeText} from './format.js';
import {leastFree} from './memory.js';

const NAMED = 3; // who grew or shrank most

function count(number, one, many) {
  return `${number} ${number === 1 ? one : many}`;
}

// The moment with the least free memory; the last one if that is the first.
export function tightest(data) {
  return leastFree(data) || data.head.full.taken.length - 1;
}

// How much of what was recorded the page shows.
function extentText({moments, full, points, lines}) {
  const [first, last] = [points.taken[0], points.taken.at(-1)];
  if (moments === 1) return timeText(first);
  const span = `${timeText(first)} to ${timeText(last)}, ${count(moments, 'moment', 'moments')} in ${spanText(points.steady.at(-1) - points.steady[0])}`;
  if (full.taken.length === moments) return `${span}, all of them in full`;
  const cut = lines.isCut ? ', to 1/256 of its range' : '';
  return `${span}. Shown in full: ${full.taken.length} of them, those with the least free memory in each stretch and those after a gap or restart. The balance is drawn from ${points.taken.length} moments, the least and the most free memory of each stretch; a line from the least and the greatest figure of each of ${lines.stretches} stretches${cut}.`;
}

// How long the memory was in which state.
function statesText({states, moments, roles}) {
  const shares = states.map((moment, state) => ({name: roles.states[state] ?? 'not known', share: moment / moments}))
    .filter(({share}) => share > 0);
  if (shares.length === 1) return shares[0].name;
  return shares.map(({name, share}) => `${name} ${(100 * share).toFixed(1)} %`).join(', ');
}

// Who had grown or shrunk most by the moment with the least free memory.
function growths({head, memory}, moment) {
  const {parts} = compared(memory[0], memory[moment], head.parts, 0, head.boots[0] === head.boots[moment]);
  const things = parts.filter(({info}) => info.isAdded).flatMap((part) => part.things);
  const size = ({growth}) => Math.abs(Number(growth));
  return things.sort((a, b) => size(b) - size(a)).slice(0, NAMED)
    .map((thing) => `${shownText(thing.name)} ${growthText(Number(thing.growth))}`);
}

function inShort(data) {
  const {head, memory} = data;
  const moment = tightest(data);
  const {free, total} = memory[moment].host;
  if (free === null || total === null) return null;
  const words = [element('strong', {}, `${memoryText(Number(free))} of ${memoryText(Number(total))} free`), ` at ${timeText(head.full.taken[moment])}`];
  if (moment !== 0) {
    const isLeast = moment === leastFree(data);
    const grown = growths(data, moment).map((text) => element('span', {class: text.length < 40 ? 'word' : null}, text));
    words.push(isLeast ? ', the least of all. ' : '. ');
    if (grown.length > 0) words.push(`Since ${timeText(head.full.taken[0])}: `, ...grown.flatMap((each, i) => (i === 0 ? [each] : [', ', each])), '.');
  }
  return element('p', {class: 'short'}, ...words);
}

function remarks({moments, marks, problems}) {
  const items = marks.all.map((mark) => `${timeText(mark.at)}: ${markText(mark)}`);
  if (marks.leftOut > 0) items.push(`and ${marks.leftOut} more of these`);
  const reads = (number) => (moments === 1 ? count(number, 'read', 'reads') : `up to ${count(number, 'read', 'reads')} of a moment`);
  if (marks.refused > 0) items.push(`${reads(marks.refused)} refused for want of rights`);
  if (marks.failed > 0) items.push(`${reads(marks.failed)} failed`);
  if (marks.lossy > 0) items.push(`of ${count(marks.lossy, 'moment', 'moments')} something was left out`);
  items.push(...problems.map(shownText));
  if (items.length === 0) return null;
  return element('details', {class: 'remarks', open: items.length < 4}, element('summary', {}, count(items.length, 'remark', 'remarks')),
    element('ul', {}, ...items.map((item) => element('li', {}, item))));
}

function zoneText() {
  return isUtc ? 'Times are in UTC, as in the reports.' : `Times are those of ${ZONE}, with UTC, which the reports have, beside them.`;
}

export function header(data) {
  const {head} = data;
  return element('header', {},
    element('h1', {}, shownText(head.title)),
    element('p', {}, element('b', {}, shownText(head.host)), ` · ${extentText(head)}`),
    inShort(data),
    element('p', {class: 'note'}, `Memory state ${statesText(head)}. Kernel's definitions built ${shownText(head.kernel)}. ${zoneText()}`),
    remarks(head));
}
