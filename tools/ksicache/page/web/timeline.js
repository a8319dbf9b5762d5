// What happened: the balance of the host over time. A moment is chosen by a click, a span by
// dragging, and both by the sliders below.
import {Rows, stackOf} from './balance.js';
import {element, svg} from './dom.js';
import {memoryText, spanText, tickText, timeText} from './format.js';

const HEIGHT = 210;
const MARGIN = {left: 52, right: 26, top: 20, bottom: 22};
const DRAG = 5; // what is moved less is a click

// The host's balance at the moments that it is drawn from.
function balances(data) {
  const roles = data.head.roles;
  const host = new Rows({...data, moments: data.points}, 0, roles.report);
  const points = [];
  data.points.forEach((reports, i) => {
    const row = reports[data.hostReport]?.[0];
    const stack = row === undefined ? null : stackOf(host, row, roles);
    points.push({time: data.head.points[i], stack, state: row === undefined ? null : host.value(row, roles.state)});
  });
  return points;
}

function freeOf(point) {
  return point.stack.find((part) => part.key === 'free').bytes;
}

// How bad a memory state is, from 0 to 4; what is not told is none.
function levelOf(data, state) {
  const place = data.head.roles.states.indexOf(state);
  return state === null ? 0 : place < 0 ? 1 : Math.min(place, 4);
}

// Between which points nothing was recorded.
export function isBreak(marks, before, after) {
  return marks.some((mark) => mark.kind !== 'clock' && mark.at > before && mark.at <= after);
}

// Splits points where nothing was recorded between two of them.
export function runsOf(points, marks, isDrawn) {
  const runs = [[]];
  points.forEach((point, i) => {
    if (!isDrawn(point) || (i > 0 && isBreak(marks, points[i - 1].time, point.time))) runs.push([]);
    if (isDrawn(point)) runs.at(-1).push(point);
  });
  return runs.filter((run) => run.length > 0);
}

const MARKS = {
  reboot: (mark) => `restarted, ${spanText(mark.time)} between the moments`,
  gap: (mark) => `nothing recorded for ${spanText(mark.time)}`,
  skipped: () => 'moments before it were left out',
  clock: (mark) => `the clock was set ${mark.time > 0 ? 'forward' : 'back'} by ${spanText(mark.time)}`,
};

export function markText(mark) {
  return MARKS[mark.kind](mark);
}

export class Timeline {
  constructor(data, state) {
    this.data = data;
    this.state = state;
    this.points = balances(data);
    this.marks = data.head.marks.all;
    this.inputs = {};
    this.svg = svg('svg', {class: 'chart', height: HEIGHT, role: 'img', 'aria-labelledby': 'timeline-name'});
    this.told = element('p', {class: 'detail'});
    this.view = element('section', {class: 'when', 'aria-labelledby': 'when'},
      element('h2', {id: 'when'}, 'What happened'), this.legend(), this.svg, this.sliders(), this.shortcuts(), this.told);
    state.watch(['at', 'from'], () => this.showChosen());
    new ResizeObserver(() => this.draw()).observe(this.svg);
    this.listen();
  }

  legend() {
    const parts = (this.points.find((point) => point.stack !== null)?.stack ?? []).slice().reverse();
    const states = new Set(this.points.map((point) => point.state));
    const bad = this.data.head.roles.states.filter((state) => states.has(state) && levelOf(this.data, state) > 0);
    const item = (style, text) => element('li', {}, element('span', {class: `swatch ${style}`}), text);
    return element('ul', {class: 'legend', 'aria-label': 'Parts, and states of the memory'},
      ...parts.map((part) => item(part.key, part.title)),
      ...bad.map((state) => item(`level${levelOf(this.data, state)}`, `State ${state}`)));
  }

  sliders() {
    const slider = (name, text) => {
      const output = element('output', {});
      const input = element('input', {
        type: 'range', min: 0, max: this.data.head.full.length - 1, step: 1, id: `slider-${name}`,
        oninput: () => this.choose(name, Number(input.value)),
      });
      this.inputs[name] = {input, output};
      return element('div', {class: 'slider'}, element('label', {for: `slider-${name}`}, text), input, output);
    };
    return element('div', {class: 'sliders'}, slider('at', 'Moment'), slider('from', 'Compared with'));
  }

  choose(name, moment) {
    this.state.set({[name]: moment});
  }

  // The moments that are asked for most.
  shortcuts() {
    const {full} = this.data.head;
    const tightest = this.points.filter((point) => point.stack !== null)
      .reduce((best, point) => (best === null || freeOf(point) < freeOf(best) ? point : best), null);
    const button = (text, moment) => element('button', {type: 'button', onclick: () => this.choose('at', moment)}, text);
    return element('div', {class: 'tools'}, button('First moment', 0),
      tightest === null ? null : button('Least free memory', this.momentAt(tightest.time)),
      button('Last moment', full.length - 1));
  }

  draw() {
    this.width = this.svg.clientWidth;
    if (this.width === 0) return;
    const {points} = this;
    this.x = d3.scaleTime([points[0].time / 1000, points.at(-1).time / 1000], [MARGIN.left, this.width - MARGIN.right]);
    const most = d3.max(points, (point) => (point.stack === null ? 0 : d3.sum(point.stack, (part) => part.bytes)));
    this.y = d3.scaleLinear([0, most || 1], [HEIGHT - MARGIN.bottom, MARGIN.top]);
    this.svg.setAttribute('viewBox', `0 0 ${this.width} ${HEIGHT}`);
    this.svg.replaceChildren(
      svg('title', {id: 'timeline-name'}, 'The balance of the memory over time'),
      ...this.areas(), ...this.states(), ...this.axes(), ...this.markLines(), this.ticks());
    this.cursor = svg('g', {class: 'cursor'});
    this.svg.append(this.cursor);
    this.showChosen();
  }

  at(time) {
    return this.x(time / 1000);
  }

  areas() {
    const runs = runsOf(this.points, this.marks, (point) => point.stack !== null);
    const keys = runs.length === 0 ? [] : runs[0][0].stack.map((part) => part.key);
    return runs.flatMap((run) => keys.map((key, place) => {
      const base = (point) => d3.sum(point.stack.slice(0, place), (part) => part.bytes);
      const area = d3.area()
        .x((point) => this.at(point.time))
        .y0((point) => this.y(base(point)))
        .y1((point) => this.y(base(point) + point.stack[place].bytes));
      // A moment by itself is as wide as a line.
      const drawn = run.length > 1 ? area(run)
        : `M${this.at(run[0].time)},${this.y(base(run[0]))}V${this.y(base(run[0]) + run[0].stack[place].bytes)}`;
      return svg('path', {class: `area ${key}${run.length > 1 ? '' : ' single'}`, d: drawn});
    }));
  }

  // A line above the balance for the memory state, where it is not the best one.
  states() {
    const bars = [];
    this.points.forEach((point, i) => {
      const level = levelOf(this.data, point.state);
      if (level === 0) return;
      const from = this.at(point.time);
      const to = i + 1 < this.points.length ? this.at(this.points[i + 1].time) : from + 3;
      bars.push(svg('rect', {class: `state level${level}`, x: from, width: Math.max(to - from, 2), y: MARGIN.top - 9, height: 6},
        svg('title', {}, `memory state ${point.state} at ${timeText(point.time)}`)));
    });
    return bars;
  }

  axes() {
    const bottom = svg('g', {class: 'axis', transform: `translate(0,${HEIGHT - MARGIN.bottom})`});
    const left = svg('g', {class: 'axis', transform: `translate(${MARGIN.left},0)`});
    d3.axisBottom(this.x).tickFormat(tickTime).ticks(Math.max(2, Math.floor(this.width / 110))).tickSizeOuter(0)(d3.select(bottom));
    d3.axisLeft(this.y).tickValues(memoryTicks(this.y.domain()[1])).tickFormat(tickText).tickSizeOuter(0)(d3.select(left));
    return [bottom, left];
  }

  markLines() {
    return this.marks.map((mark) => {
      const x = this.at(mark.at);
      const from = mark.kind === 'clock' ? x : this.at(mark.at - mark.time);
      return svg('g', {class: `mark ${mark.kind}`},
        svg('rect', {x: Math.max(from, MARGIN.left), y: MARGIN.top, width: Math.max(x - Math.max(from, MARGIN.left), 1), height: HEIGHT - MARGIN.top - MARGIN.bottom}),
        ['gap', 'skipped'].includes(mark.kind) ? null : svg('text', {x: x + 3, y: MARGIN.top + 10}, mark.kind === 'reboot' ? 'restart' : 'clock'),
        svg('title', {}, `${timeText(mark.at)}: ${markText(mark)}`));
    });
  }

  // The moments that are shown in full.
  ticks() {
    const y = HEIGHT - MARGIN.bottom;
    const d = this.data.head.full.map((time) => `M${this.at(time).toFixed(1)},${y}v4`).join('');
    return svg('path', {class: 'full', d});
  }

  showChosen() {
    const {full} = this.data.head;
    const at = this.state.get('at');
    const from = this.state.get('from');
    for (const [name, moment] of [['at', at], ['from', from]]) {
      const {input, output} = this.inputs[name];
      input.value = moment;
      input.setAttribute('aria-valuetext', timeText(full[moment]));
      output.textContent = timeText(full[moment]);
    }
    if (this.x === undefined) return;
    const [left, right] = [full[at], full[from]].map((time) => this.at(time)).sort((a, b) => a - b);
    const line = (time, kind) => svg('line', {class: kind, x1: this.at(time), x2: this.at(time), y1: MARGIN.top - 2, y2: HEIGHT - MARGIN.bottom + 4});
    this.cursor.replaceChildren(
      svg('rect', {class: 'span', x: left, width: right - left, y: HEIGHT - MARGIN.bottom, height: 4}),
      line(full[from], 'from'), line(full[at], 'at'));
    this.tell(full[at]);
  }

  // What the balance was then.
  tell(time) {
    const point = this.nearest(this.points, (each) => each.time, time);
    if (point.stack === null) return this.told.replaceChildren(`${timeText(point.time)}: no figures`);
    const parts = point.stack.filter((part) => part.bytes > 0).reverse().map((part) => `${part.title} ${memoryText(part.bytes)}`);
    const state = point.state === null ? [] : [`memory state ${point.state}`];
    return this.told.replaceChildren(element('strong', {}, timeText(point.time)), ` ${[...parts, ...state].join(' · ')}`);
  }

  nearest(all, timeOf, time) {
    return all.reduce((best, each) => (Math.abs(timeOf(each) - time) < Math.abs(timeOf(best) - time) ? each : best));
  }

  // The time below the pointer.
  timeOf(event) {
    const x = event.clientX - this.svg.getBoundingClientRect().left;
    return this.x.invert(x).getTime() * 1000;
  }

  momentAt(time) {
    const {full} = this.data.head;
    return full.indexOf(this.nearest(full, (each) => each, time));
  }

  listen() {
    let start = null;
    this.svg.addEventListener('pointerdown', (event) => {
      start = {x: event.clientX, moment: this.momentAt(this.timeOf(event))};
      this.svg.setPointerCapture(event.pointerId);
    });
    this.svg.addEventListener('pointermove', (event) => {
      if (this.x === undefined) return;
      if (start === null) this.tell(this.timeOf(event));
      else if (Math.abs(event.clientX - start.x) > DRAG) this.state.set({from: start.moment, at: this.momentAt(this.timeOf(event))});
    });
    this.svg.addEventListener('pointerup', (event) => {
      if (start !== null && Math.abs(event.clientX - start.x) <= DRAG) this.state.set({at: start.moment});
      start = null;
    });
    this.svg.addEventListener('pointerleave', () => this.tell(this.data.head.full[this.state.get('at')]));
  }
}

// A time on an axis: its day at midnight, its second where there is one.
export function tickTime(date) {
  const isAt = (interval) => interval(date).getTime() === date.getTime();
  const format = isAt(d3.timeDay) ? '%Y-%m-%d' : isAt(d3.timeMinute) ? '%H:%M' : '%H:%M:%S';
  return d3.timeFormat(format)(date);
}

// Round figures of memory from 0 to about `most`.
export function memoryTicks(most) {
  const rough = Math.max(most, 1) / 4;
  let step = 2 ** Math.floor(Math.log2(rough));
  if (most / step > 6) step *= 2;
  return d3.range(0, most * 1.0001, step);
}
