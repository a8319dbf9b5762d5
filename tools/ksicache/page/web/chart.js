// What the charts have in common: their times, what happened between moments, and their axes.
//
// They go by the steady time of moments, so that none lies on another where the clock was set back;
// what they say of it is the time on the wall.
import {svg} from './dom.js';
import {tickText} from './format.js';
import {spanText, timeText} from './times.js';

const DRAG = 5; // what is moved less is a click
const LEFT = 52;
const RIGHT = 26;
export const BOTTOM = 22;

// The time on the wall at a steady one, by moments {taken, steady} around it.
export function wallTime({taken, steady}, time) {
  const place = Math.max(0, d3.bisectRight(steady, time) - 1);
  return time + taken[place] - steady[place];
}

export function timeScale(first, last, width) {
  return d3.scaleTime([first / 1000, last / 1000], [LEFT, width - RIGHT]);
}

// Shapes as far as their times are in sight: what is zoomed into leaves others out.
export function clipped(id, width, height, ...shapes) {
  const sight = svg('clipPath', {id}, svg('rect', {x: LEFT - 4, width: Math.max(0, width - LEFT - RIGHT + 8), height}));
  return [sight, svg('g', {'clip-path': `url(#${id})`}, ...shapes)];
}

// A time on an axis: its day at midnight, its second where there is one.
function tickTime(date) {
  const isAt = (interval) => interval(date).getTime() === date.getTime();
  const format = isAt(d3.timeDay) ? '%Y-%m-%d' : isAt(d3.timeMinute) ? '%H:%M' : '%H:%M:%S';
  return d3.timeFormat(format)(date);
}

export function timeAxis(x, moments, width, height) {
  const axis = svg('g', {class: 'axis', transform: `translate(0,${height - BOTTOM})`});
  const text = (date) => tickTime(new Date(wallTime(moments, date.getTime() * 1000) / 1000));
  d3.axisBottom(x).tickFormat(text).ticks(Math.max(2, Math.floor(width / 110))).tickSizeOuter(0)(d3.select(axis));
  return axis;
}

// Of a scale from 0 on; `ticks` adds what stands on it.
export function figureAxis(y, ticks) {
  const axis = svg('g', {class: 'axis', transform: `translate(${LEFT},0)`});
  ticks(d3.axisLeft(y)).tickSizeOuter(0)(d3.select(axis));
  return axis;
}

// Round figures of memory from 0 to about `most`.
export function memoryTicks(most) {
  const rough = Math.max(most, 1) / 4;
  let step = Math.max(1, 2 ** Math.floor(Math.log2(rough)));
  if (most / step > 6) step *= 2;
  return (axis) => axis.tickValues(d3.range(0, most * 1.0001, step)).tickFormat(tickText);
}

// What is called by a word in a chart.
const WORDS = {reboot: 'restart', clock: 'clock', lost: 'damage', gap: 'gap'};

// When it happened, and what.
export function markText(mark) {
  return `${timeText(mark.at)}: ${mark.words.replace('{}', spanText(mark.time))}`;
}

export function markShapes(marks, x, top, height) {
  return marks.map((mark) => {
    const end = x(mark.steady / 1000);
    const start = mark.kind === 'clock' ? end : Math.max(LEFT, x((mark.steady - mark.time) / 1000));
    // A gap has room for its word, or needs none.
    const isGap = mark.kind === 'gap';
    const word = isGap && end - start < 30 ? undefined : WORDS[mark.kind];
    return svg('g', {class: `mark ${mark.kind}`},
      svg('rect', {x: start, y: top, width: Math.max(end - start, 1), height: height - top - BOTTOM}),
      word === undefined ? null : svg('text', {x: (isGap ? start : end) + 3, y: top + 10}, word),
      svg('title', {}, markText(mark)));
  });
}

// What happened at a steady time of which nothing is known.
function markAt(marks, time) {
  return marks.find((mark) => mark.kind !== 'clock' && mark.steady - mark.time < time && time < mark.steady);
}

// Whether nothing is known of some time between two steady ones.
export function isBreak(marks, before, after) {
  return marks.some((mark) => mark.kind !== 'clock' && mark.steady > before && mark.steady <= after);
}

// Splits points {from, to}, which are steady times, where nothing is known between two of them. One
// with such a time within has an end of its own on both sides. Each has `time`, where it is drawn.
export function runsOf(points, marks, isDrawn) {
  const runs = [[]];
  points.forEach((point, i) => {
    const isDue = isDrawn(point);
    if (!isDue || (i > 0 && isBreak(marks, points[i - 1].to, point.from))) runs.push([]);
    if (!isDue) return;
    if (isBreak(marks, point.from, point.to)) {
      runs.at(-1).push({...point, time: point.from});
      runs.push([{...point, time: point.to}]);
    } else {
      runs.at(-1).push({...point, time: (point.from + point.to) / 2});
    }
  });
  return runs.filter((run) => run.length > 0);
}

// Lines at the chosen moments.
export function chosenLines({at, from}, x, top, bottom) {
  const line = (time, kind) => svg('line', {class: kind, x1: x(time / 1000), x2: x(time / 1000), y1: top, y2: bottom});
  return [line(from, 'from'), line(at, 'at')];
}

// The place of the time that is nearest to one.
export function nearest(times, time) {
  return d3.minIndex(times, (each) => Math.abs(each - time));
}

// A moment is chosen by a click in a chart {svg, x, pointer, told, data, state, tell}, a span by
// dragging; what there is at the pointer is told, and a line stands where that is.
export function listen(chart) {
  const {svg: shape, state, data: {head: {full: {steady}, marks}}} = chart;
  let start = null;
  const timeOf = (event) => chart.x.invert(event.clientX - shape.getBoundingClientRect().left).getTime() * 1000;
  const momentOf = (event) => nearest(steady, timeOf(event));
  // The steady time of what is told.
  const tellOf = (time) => {
    const mark = markAt(marks.all, time);
    if (mark === undefined) return chart.tell(time);
    chart.told.replaceChildren(markText(mark));
    return time;
  };
  const point = (time) => {
    const [, , , height] = shape.getAttribute('viewBox').split(' ');
    const x = chart.x(tellOf(time) / 1000);
    chart.pointer.replaceChildren(svg('line', {x1: x, x2: x, y1: 0, y2: height - BOTTOM}));
  };
  shape.addEventListener('pointerdown', (event) => {
    if (event.button !== 0) return;
    start = {x: event.clientX, moment: momentOf(event)};
    shape.setPointerCapture(event.pointerId);
  });
  shape.addEventListener('pointermove', (event) => {
    if (chart.x === undefined) return;
    if (start === null) point(timeOf(event));
    else if (Math.abs(event.clientX - start.x) > DRAG) state.set({from: start.moment, at: momentOf(event)});
  });
  shape.addEventListener('pointerup', (event) => {
    if (start !== null && Math.abs(event.clientX - start.x) <= DRAG) state.set({at: start.moment});
    start = null;
  });
  shape.addEventListener('pointercancel', () => { start = null; });
  shape.addEventListener('pointerleave', () => {
    chart.tell(steady[state.get('at')]);
    chart.pointer?.replaceChildren();
  });
}
