// The head of the page: whose memory, when, and in short what there is to see.
import {markText} from './chart.js';
import {byGrowth, compared} from './comparison.js';
import {clamped, element, joined, nameView} from './dom.js';
import {UNITS, memoryText, shortText, shownText, signedText} from './format.js';
import {leastFree} from './memory.js';
import {spanText, timeText, zoneText} from './times.js';

const NAMED = 3; // of those who explain it
const OPPOSED = 1; // of those who changed the other way

function count(number, one, many) {
  return `${number} ${number === 1 ? one : many}`;
}

// How much of what was recorded the page shows.
function extentText({head: {moments, full, points, lines}, balance}) {
  const [first, last] = [points.taken[0], points.taken.at(-1)];
  if (moments === 1) return timeText(first);
  const span = `${timeText(first)} to ${timeText(last)}, ${count(moments, 'moment', 'moments')} in ${spanText(points.steady.at(-1) - points.steady[0])}`;
  if (full.taken.length === moments) return `${span}, all of them in full`;
  const cut = lines.isCut ? ', to 1/256 of its range' : '';
  return `${span}. Shown in full: ${full.taken.length} of them, those with the least free memory in each stretch, those at which figures were the worst, and those after a gap or restart. The balance is drawn from these and from the least and the most free memory of each stretch, ${balance.length} moments; a line from the least and the greatest figure of each of ${lines.stretches} stretches${cut}.`;
}

// At how many moments the memory was in which state.
function statesText({states, moments, roles}) {
  const shares = states.map((moment, state) => ({name: roles.states[state] ?? 'not known', share: moment / moments}))
    .filter(({share}) => share > 0);
  if (shares.length === 1) return shares[0].name;
  return `${shares.map(({name, share}) => `${name} ${(100 * share).toFixed(1)} %`).join(', ')} of the moments`;
}

// Who explains what is more or less in use at one moment than at another, {name, growth}: those whose
// memory changed most and the same way, and who changed most the other way.
function explained({head, memory}, from, at) {
  const {host, parts} = compared(memory[from], memory[at], head.parts, UNITS.mb.shift, head.boots[from] === head.boots[at]);
  const whole = host.used.growth;
  if (whole === null || whole === 0n) return {same: [], other: []};
  const heaps = parts.find(({info}) => info.name === 'heaps');
  const others = [
    {name: 'caches', growth: host.caches.growth},
    {name: 'the kernel outside of heaps', growth: host.kernel.growth === null || heaps.growth === null ? null : host.kernel.growth - heaps.growth},
  ];
  const things = parts.filter(({info}) => info.isAdded).flatMap((part) => part.things);
  const changed = [...others, ...things].filter(({growth}) => growth !== null && growth !== 0n).sort(byGrowth);
  const isSame = ({growth}) => growth > 0n === whole > 0n;
  return {same: changed.filter(isSame).slice(0, NAMED), other: changed.filter((each) => !isSame(each)).slice(0, OPPOSED)};
}

// "db-orders +100 MB, mail +20 MB"
function growthWords(things) {
  const words = things.map(({name, growth}) => {
    const short = shortText(shownText(name));
    return element('span', {class: short.length < 30 ? 'word' : null}, nameView(short), ` ${signedText(growth)} MB`);
  });
  return joined(words, ', ');
}

// What there is to say of the chosen moments.
function inShort(data, from, at) {
  const {head, memory} = data;
  const {free, total} = memory[at].host;
  if (free === null || total === null) return [];
  const isLeast = head.full.taken.length > 1 && at === leastFree(data);
  const words = [element('strong', {}, `${memoryText(Number(free))} of ${memoryText(Number(total))} free`), ` at ${timeText(head.full.taken[at])}${isLeast ? ', the least of all' : ''}. `];
  const [first, last] = [from, at].sort((a, b) => a - b);
  const {same, other} = explained(data, first, last);
  if (same.length === 0) return words;
  words.push(`${timeText(head.full.taken[first])} to ${timeText(head.full.taken[last])}: `, ...growthWords(same));
  if (other.length > 0) words.push('; the other way ', ...growthWords(other));
  return [...words, '.'];
}

function shortView(data, state) {
  const view = element('p', {class: 'short', role: 'status'});
  const show = () => {
    view.replaceChildren(...inShort(data, state.get('from'), state.get('at')));
    view.hidden = view.childNodes.length === 0;
  };
  state.watch(['at', 'from'], show);
  show();
  return view;
}

function remarks({moments, marks, problems}) {
  const items = marks.all.map(markText);
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
    element('p', {}, clamped('b', shownText(head.host)), ` · ${extentText(data)}`),
    shortView(data, state),
    element('p', {class: 'note'}, `Memory state ${statesText(head)}. Kernel's definitions built ${shownText(head.kernel)}. ${zoneText()}`),
    remarks(head));
}
