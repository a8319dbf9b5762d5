// What happened: the balance of the host over time. Moments are chosen by the sliders below, too.
import {Rows, freeOf, stackOf} from './balance.js';
import {
  BOTTOM, chosenLines, clipped, figureAxis, isBreak, listen, markShapes, memoryTicks, nearest, runsOf, timeAxis, timeScale,
} from './chart.js';
import {element, svg} from './dom.js';
import {memoryText} from './format.js';
import {leastFree} from './memory.js';
import {timeText} from './times.js';

const HEIGHT = 210;
const TOP = 20;

// The host's balance at the moments that it is drawn from.
function balances(data) {
  const roles = data.head.roles;
  const host = new Rows(data, 0, roles.report);
  return data.balance.map(({taken, steady, rows}) => {
    const row = rows?.[0];
    const stack = row === undefined ? null : stackOf(host, row, roles);
    return {from: steady, to: steady, taken, stack, state: row === undefined ? null : host.value(row, roles.state)};
  });
}

// Whether it can be drawn.
function isTold({stack}) {
  return stack !== null && freeOf(stack) !== null;
}

// What is below the free memory.
function usedOf(point) {
  return d3.sum(point.stack, (part) => part.bytes) - freeOf(point.stack);
}

// How bad a memory state is, from 0 to 4; what is not told is none.
function levelOf(data, state) {
  const place = data.head.roles.states.indexOf(state);
  return state === null ? 0 : place < 0 ? 1 : Math.min(place, 4);
}

export class Timeline {
  constructor(data, state) {
    this.data = data;
    this.state = state;
    this.points = balances(data);
    this.steady = this.points.map((point) => point.from);
    this.marks = data.head.marks.all;
    this.inputs = {};
    this.svg = svg('svg', {class: 'chart', height: HEIGHT, role: 'img', 'aria-labelledby': 'timeline-name'});
    this.zoom = element('button', {type: 'button', onclick: () => this.zoomIn()}, 'Zoom to the span');
    this.whole = element('button', {type: 'button', onclick: () => state.set({zoom: null})}, 'Whole time');
    this.told = element('p', {class: 'detail'});
    this.view = element('section', {class: 'when', 'aria-labelledby': 'when'},
      element('h2', {id: 'when'}, 'What happened'), this.legend(), this.svg, this.sliders(), this.shortcuts(), this.told);
    state.watch(['at', 'from'], () => {
      this.keepInSight();
      this.showChosen();
    });
    state.watch(['zoom'], () => this.draw());
    new ResizeObserver(() => this.draw()).observe(this.svg);
    listen(this);
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
      const output = element('span', {class: 'time'});
      const input = element('input', {
        type: 'range', min: 0, max: this.data.head.full.taken.length - 1, step: 1, id: `slider-${name}`,
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

  // What is chosen is seen: a zoom that leaves it out ends.
  keepInSight() {
    const zoom = this.state.get('zoom');
    if (zoom === null) return;
    const [first, last] = this.span();
    if (first < zoom[0] || last > zoom[1]) this.state.set({zoom: null});
  }

  zoomIn() {
    const [first, last] = this.span();
    if (first < last) this.state.set({zoom: [first, last]});
  }

  // The moments that are asked for most.
  shortcuts() {
    const least = leastFree(this.data);
    const button = (text, moment) => element('button', {type: 'button', onclick: () => this.choose('at', moment)}, text);
    return element('div', {class: 'tools'}, button('First moment', 0),
      least === null ? null : button('Least free memory', least),
      button('Last moment', this.data.head.full.taken.length - 1), this.zoom, this.whole);
  }

  // The steady times of the chosen moments.
  span() {
    const {steady} = this.data.head.full;
    return ['at', 'from'].map((name) => steady[this.state.get(name)]).sort((a, b) => a - b);
  }

  draw() {
    this.width = this.svg.clientWidth;
    if (this.width === 0) return;
    const {points} = this;
    this.x = timeScale(...this.state.get('zoom') ?? [points[0].from, points.at(-1).to], this.width);
    const most = d3.max(points, (point) => (point.stack === null ? 0 : d3.sum(point.stack, (part) => part.bytes)));
    this.y = d3.scaleLinear([0, most || 1], [HEIGHT - BOTTOM, TOP]);
    this.svg.setAttribute('viewBox', `0 0 ${this.width} ${HEIGHT}`);
    this.cursor = svg('g', {class: 'cursor'});
    this.pointer = svg('g', {class: 'pointer'});
    this.svg.replaceChildren(
      svg('title', {id: 'timeline-name'}, 'The balance of the memory over time'),
      timeAxis(this.x, this.data.head.points, this.width, HEIGHT), figureAxis(this.y, memoryTicks(most)),
      ...clipped('timeline-sight', this.width, HEIGHT, ...this.areas(), ...this.states(),
        ...markShapes(this.marks, this.x, TOP, HEIGHT), this.ticks(), this.pointer, this.cursor, ...this.edges(), ...this.least()));
    this.showChosen();
  }

  at(time) {
    return this.x(time / 1000);
  }

  runs() {
    return runsOf(this.points, this.marks, isTold);
  }

  // Where the free memory begins: as wide as can be seen where it was there for a moment only.
  edges() {
    const edge = d3.line().x((point) => this.at(point.time)).y((point) => this.y(usedOf(point)));
    return this.runs().filter((run) => run.length > 1).map((run) => svg('path', {class: 'edge', d: edge(run)}));
  }

  // The moment with the least free memory.
  least() {
    const told = this.points.filter(isTold);
    const point = d3.least(told, ({stack}) => freeOf(stack));
    if (point === undefined) return [];
    return [svg('circle', {class: 'least', cx: this.at(point.from), cy: this.y(usedOf(point)), r: 4},
      svg('title', {}, `the least that was free: ${memoryText(freeOf(point.stack))} at ${timeText(point.taken)}`))];
  }

  areas() {
    const runs = this.runs();
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
      const from = this.at(point.from);
      const next = this.points[i + 1];
      const isLast = next === undefined || isBreak(this.marks, point.to, next.from);
      const to = isLast ? from + 3 : this.at(next.from);
      bars.push(svg('rect', {class: `state level${level}`, x: from, width: Math.max(to - from, 2), y: TOP - 9, height: 6},
        svg('title', {}, `memory state ${point.state} at ${timeText(point.taken)}`)));
    });
    return bars;
  }

  // The moments that are shown in full.
  ticks() {
    const y = HEIGHT - BOTTOM;
    const d = this.data.head.full.steady.map((time) => `M${this.at(time).toFixed(1)},${y}v4`).join('');
    return svg('path', {class: 'full', d});
  }

  showChosen() {
    const {taken, steady} = this.data.head.full;
    const chosen = {at: this.state.get('at'), from: this.state.get('from')};
    for (const [name, moment] of Object.entries(chosen)) {
      const {input, output} = this.inputs[name];
      input.value = moment;
      input.setAttribute('aria-valuetext', timeText(taken[moment]));
      output.textContent = timeText(taken[moment]);
    }
    // One that is disabled would lose the focus.
    this.zoom.setAttribute('aria-disabled', chosen.at === chosen.from);
    this.whole.setAttribute('aria-disabled', this.state.get('zoom') === null);
    if (this.x === undefined) return;
    const [at, from] = [steady[chosen.at], steady[chosen.from]];
    const [left, right] = [this.at(at), this.at(from)].sort((a, b) => a - b);
    this.cursor.replaceChildren(
      svg('rect', {class: 'span', x: left, width: right - left, y: HEIGHT - BOTTOM, height: 4}),
      ...chosenLines({at, from}, this.x, TOP - 2, HEIGHT - BOTTOM + 4));
    this.tell(at);
  }

  // Tells what the balance was at a steady time, or at the moment nearest to it, whose time it gives.
  tell(time) {
    const point = this.points[nearest(this.steady, time)];
    const parts = (point.stack ?? []).filter((part) => part.bytes !== 0).reverse().map((part) => `${part.title} ${memoryText(part.bytes)}`);
    const state = point.state === null ? [] : [`memory state ${point.state}`];
    const words = point.stack === null ? 'how the memory divided is not known' : [...parts, ...state].join(' · ');
    this.told.replaceChildren(element('strong', {}, timeText(point.taken)), ` ${words}`);
    return point.from;
  }
}
