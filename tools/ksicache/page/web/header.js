// The head of the page: whose memory, when, and in short what there is to see.
import {markText} from './chart.js';
import {compared} from './comparison.js';
import {clamped, element} from './dom.js';
import {UNITS, memoryText, shownText, signedText} from './format.js';
import {leastFree} from './memory.js';
import {spanText, timeText, zoneText} from './times.js';

const NAMED = 3; // of those who explain it

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
  return `${span}. Shown in full: ${full.taken.length} of them, those with the least free memory in each stretch, those at which figures were the worst, and those after a gap or restart. The balance is drawn from ${points.taken.length} moments, the least and the most free memory of each stretch; a line from the least and the greatest figure of each of ${lines.stretches} stretches${cut}.`;
}

// How long the memory was in which state.
function statesText({states, moments, roles}) {
  const shares = states.map((moment, state) => ({name: roles.states[state] ?? 'not known', share: moment / moments}))
    .filter(({share}) => share > 0);
  if (shares.length === 1) return shares[0].name;
  return shares.map(({name, share}) => `${name} ${(100 * share).toFixed(1)} %`).join(', ');
}

// Who explains what is more or less in use at one moment than at another: those whose memory changed
// most and the same way.
function explained({head, memory}, from, at) {
  const {host, parts} = compared(memory[from], memory[at], head.parts, UNITS.mb.shift, head.boots[from] === head.boots[at]);
  const whole = host.used.growth;
  if (whole === null || whole === 0n) return [];
  const heaps = parts.find(({info}) => info.name === 'heaps');
  const others = [
    {name: 'caches', growth: host.caches.growth},
    {name: 'the kernel outside of heaps', growth: host.kernel.growth === null || heaps.growth === null ? null : host.kernel.growth - heaps.growth},
  ];
  const things = parts.filter(({info}) => info.isAdded).flatMap((part) => part.things);
  const size = ({growth}) => (growth < 0n ? -growth : growth);
  return [...others, ...things].filter(({growth}) => growth !== null && growth !== 0n && growth > 0n === whole > 0n)
    .sort((a, b) => (size(b) > size(a) ? 1 : size(b) < size(a) ? -1 : 0)).slice(0, NAMED)
    .map(({name, growth}) => `${shownText(name)} ${signedText(growth)} MB`);
}

// What there is to say of the chosen moments.
function inShort(data, from, at) {
  const {head, memory} = data;
  const {free, total} = memory[at].host;
  if (free === null || total === null) return [];
  const isLeast = head.full.taken.length > 1 && at === leastFree(data);
  const words = [element('strong', {}, `${memoryText(Number(free))} of ${memoryText(Number(total))} free`), ` at ${timeText(head.full.taken[at])}${isLeast ? ', the least of all' : ''}. `];
  const [first, last] = [from, at].sort((a, b) => a - b);
  const grown = explained(data, first, last).map((text) => element('span', {class: text.length < 40 ? 'word' : null}, text));
  if (grown.length > 0) words.push(`${timeText(head.full.taken[first])} to ${timeText(head.full.taken[last])}: `, ...grown.flatMap((each, i) => (i === 0 ? [each] : [', ', each])), '.');
  return words;
}

function shortView(data, state) {
  const view = element('p', {class: 'short'});
  const show = () => {
    view.replaceChildren(...inShort(data, state.get('from'), state.get('at')));
    view.hidden = view.childNodes.length === 0;
  };
  state.watch(['at', 'from'], show);
  show();
  return view;
}

function remarks({moments, marks, problems}) {
  const items = marks.all.map((mark) => `${timeText(mark.at)}: ${markText(mark)}`);
  if (marks.leftOut > 0) items.push(`and ${marks.leftOut} more of these`);
  for (const [reads, what] of [[marks.refused, 'refused for want of rights'], [marks.failed, 'failed']]) {
    if (reads.most === 0) continue;
    const when = moments === 1 ? '' : ` at ${timeText(reads.at)}, some at ${reads.moments} of ${moments} moments`;
    items.push(`${count(reads.most, 'read', 'reads')} ${what}${when}`);
  }
  if (marks.lossy > 0) items.push(`of ${count(marks.lossy, 'moment', 'moments')} something was left out`);
  items.push(...problems.map(shownText));
  if (items.length === 0) return null;
  return element('details', {class: 'remarks', open: items.length < 4}, element('summary', {}, count(items.length, 'remark', 'remarks')),
    element('ul', {}, ...items.map((item) => element('li', {}, item))));
}

export function header(data, state) {
  const {head} = data;
  return element('header', {},
    clamped('h1', shownText(head.title)),
    element('p', {}, clamped('b', shownText(head.host)), ` · ${extentText(head)}`),
    shortView(data, state),
    element('p', {class: 'note'}, `Memory state ${statesText(head)}. Kernel's definitions built ${shownText(head.kernel)}. ${zoneText()}`),
    remarks(head));
}
