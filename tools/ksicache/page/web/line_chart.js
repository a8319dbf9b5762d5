// Figures of machines, groups, processes and heaps over time, as bands from the least to the
// greatest of each stretch of moments, and lines through both.
import {BOTTOM, chosenLines, clipped, figureAxis, listen, markShapes, memoryTicks, nearest, runsOf, timeAxis, timeScale, wallTime} from './chart.js';
import {choice, element, joined, nameView, svg} from './dom.js';
import {NO_VALUE, bytesOf, isMemory, memoryText, shortText, shownText} from './format.js';
import {Kind} from './tables.js';
import {timeText} from './times.js';

const HEIGHT = 200;
const TOP = 10;
const OFFERED = 24; // lines to choose from
const DRAWN = 5; // at first
const COLORS = 8; // that lines can have
const TOGETHER = 'all together';

// How the figures of a column are drawn and written: {figure, text, most, ticks, isStepped}; of what
// has a greatest one, `most` is it. A state lasts until there is another one.
function styleOf(column, {states}) {
  const same = (figure) => figure;
  if (isMemory(column)) return {figure: (figure) => bytesOf(figure, column), text: memoryText, ticks: memoryTicks};
  if (column.kind === Kind.text) {
    const text = (state) => states[state];
    return {figure: same, text, isStepped: true, most: states.length - 1, ticks: () => (axis) => axis.tickValues(d3.range(states.length)).tickFormat(text)};
  }
  const text = (figure) => `${figure}${column.kind === Kind.percent ? ' %' : ''}`;
  return {figure: same, text, most: column.kind === Kind.percent ? 100 : undefined, ticks: () => (axis) => axis.ticks(4).tickFormat(text)};
}

// The lines of one figure: {name, line, style}, that of all together first if it is memory.
function linesOf(data, role) {
  const report = data.head.reports.find((each) => each.name === role.report);
  const column = report.columns.find((each) => each.name === role.column);
  if (column === undefined) return [];
  const found = data.lines.lines.get(`${role.report} ${role.column}`);
  const style = styleOf(column, data.head.roles);
  const ofLine = (name, line) => ({name, line: line.map((extent) => extent && extent.map(style.figure)), style});
  const things = found.things.map(({name, line}) => ofLine(shownText(name ?? data.head.host), line));
  // Groups are in groups, whose memory they have.
  const isAdded = isMemory(column) && data.nameOf.has(role.report) && role.report !== data.head.roles.groups.report;
  return isAdded ? [ofLine(TOGETHER, found.together), ...things] : things;
}

function peak({line}) {
  return d3.max(line, (extent) => extent?.[1] ?? 0) ?? 0;
}

function least({line}) {
  return d3.min(line, (extent) => extent?.[0]) ?? Infinity;
}

// By how much a line goes up and down; where there is none, it is at 0.
function range({line}) {
  return peak({line}) - (d3.min(line, (extent) => extent?.[0] ?? 0) ?? 0);
}

// Whoever has memory by itself, of all kinds, whose memory changed most.
function movedLines(data) {
  const {things, groups} = data.head.roles;
  return things.filter((each) => each.report !== groups.report)
    .flatMap((each) => linesOf(data, {report: each.report, column: each.size}).filter(({name}) => name !== TOGETHER))
    .filter((each) => range(each) > 0).sort((a, b) => range(b) - range(a));
}

const MOVED = {title: 'What changed most'};

// The lines to choose from, the most telling first, and how many more there are.
function offered(data, role) {
  const lines = role === MOVED ? movedLines(data) : linesOf(data, role);
  const together = lines.filter(({name}) => name === TOGETHER);
  let things = lines.filter((each) => !together.includes(each));
  if (role.isLessWorse) {
    things = things.filter((each) => least(each) !== Infinity).sort((a, b) => least(a) - least(b));
  } else if (role !== MOVED) {
    things = things.filter((each) => each.style.most !== undefined || peak(each) > 0).sort((a, b) => peak(b) - peak(a));
  }
  return {lines: [...together, ...things.slice(0, OFFERED)], more: Math.max(0, things.length - OFFERED)};
}

// What a line goes through: the least and the greatest figure of each stretch, first the one that is
// nearer to where it comes from. A line between them would show what never was.
function extremes(run) {
  let last = run[0].extent[0];
  return run.flatMap(({time, extent: [least, greatest]}) => {
    const figures = Math.abs(least - last) <= Math.abs(greatest - last) ? [least, greatest] : [greatest, least];
    last = figures[1];
    return (least === greatest ? [least] : figures).map((figure) => ({time, figure}));
  });
}

export class LineChart {
  constructor(data, state) {
    Object.assign(this, {data, state, offers: new Map(), shapes: new Map(), stressed: null});
    this.middles = data.lines.times.map(([first, last]) => (first + last) / 2);
    const lines = [MOVED, ...data.head.roles.lines];
    this.svg = svg('svg', {class: 'chart', height: HEIGHT, role: 'img', 'aria-labelledby': 'lines-name'});
    this.list = element('fieldset', {class: 'lines'});
    this.told = element('p', {class: 'detail'});
    this.view = element('section', {'aria-labelledby': 'lines-title'},
      element('h2', {id: 'lines-title'}, 'Who took it'),
      choice('Show', lines.map((line, i) => [String(i), line.title]), '0', (value) => this.choose(lines[value])),
      this.svg, this.told, this.list);
    state.watch(['at', 'from'], () => this.showChosen());
    state.watch(['zoom'], () => this.draw());
    new ResizeObserver(() => this.draw()).observe(this.svg);
    listen(this);
    this.choose(lines[0]);
  }

  // What is ticked stays so while other lines are looked at.
  choose(role) {
    this.role = role;
    this.stressed = null;
    if (!this.offers.has(role)) this.offers.set(role, this.offer(role));
    Object.assign(this, this.offers.get(role));
    this.drawList();
    this.draw();
  }

  // Lines of one colour are told apart by their dashes.
  offer(role) {
    const offer = offered(this.data, role);
    let things = 0;
    for (const each of offer.lines) {
      const isTogether = each.name === TOGETHER;
      each.isDrawn = !isTogether && things < DRAWN;
      each.color = isTogether ? 'together' : `color${things % COLORS} dash${Math.floor(things / COLORS)}`;
      if (!isTogether) ++things;
    }
    return offer;
  }

  // One that is pointed at, or has the focus, stands out.
  box(line) {
    const [stress, relax] = [() => this.stress(line), () => this.stress(null)];
    const turn = (event) => {
      line.isDrawn = event.target.checked;
      this.draw();
    };
    const key = svg('svg', {class: 'key', width: 22, height: 11, 'aria-hidden': 'true'},
      svg('line', {class: `line ${line.color}`, x2: 22, y1: 5.5, y2: 5.5}));
    return element('label', {title: line.name, onpointerenter: stress, onpointerleave: relax, onfocusin: stress, onfocusout: relax},
      element('input', {type: 'checkbox', checked: line.isDrawn, onchange: turn}), key, element('span', {class: 'name'}, line.name));
  }

  drawList() {
    const boxes = this.lines.map((each) => this.box(each));
    const {title, report, column} = this.role;
    this.list.replaceChildren(element('legend', {}, report === undefined ? title : `${title}, ${report} ${column}`), ...boxes);
    if (this.more > 0) this.list.append(element('span', {class: 'note'}, `and ${this.more} more`));
    if (boxes.length === 0) this.list.append(element('span', {class: 'note'}, 'none of these has had any'));
  }

  stress(line) {
    this.stressed = line;
    for (const [each, shapes] of this.shapes) {
      for (const shape of shapes) shape.classList.toggle('stressed', each === line);
    }
  }

  draw() {
    const width = this.svg.clientWidth;
    if (width === 0) return;
    const {head, lines} = this.data;
    const drawn = this.lines.filter((each) => each.isDrawn);
    const {ticks, most = this.mostOf(drawn)} = this.lines[0]?.style ?? {ticks: memoryTicks};
    this.x = timeScale(...this.state.get('zoom') ?? [lines.times[0][0], lines.times.at(-1)[1]], width);
    this.y = d3.scaleLinear([0, most * 1.04 || 1], [HEIGHT - BOTTOM, TOP]);
    this.cursor = svg('g', {class: 'cursor'});
    this.pointer = svg('g', {class: 'pointer'});
    this.shapes = new Map(drawn.map((each) => [each, this.paths(each)]));
    this.svg.setAttribute('viewBox', `0 0 ${width} ${HEIGHT}`);
    this.svg.replaceChildren(svg('title', {id: 'lines-name'}, `${this.role.title} over time`),
      timeAxis(this.x, head.points, width, HEIGHT), figureAxis(this.y, ticks(most)),
      ...clipped('lines-sight', width, HEIGHT, ...markShapes(head.marks.all, this.x, TOP, HEIGHT),
        ...[...this.shapes.values()].flat(), this.pointer, this.cursor));
    this.stress(this.stressed);
    this.showChosen();
  }

  mostOf(lines) {
    return d3.max(lines, peak) ?? 0;
  }

  paths({line, color, style: {isStepped}}) {
    const points = line.map((extent, i) => ({from: this.data.lines.times[i][0], to: this.data.lines.times[i][1], extent}));
    const x = (point) => this.x(point.time / 1000);
    const curve = isStepped ? d3.curveStepAfter : d3.curveLinear;
    const band = d3.area().curve(curve).x(x).y0(({extent}) => this.y(extent[0])).y1(({extent}) => this.y(extent[1]));
    const through = d3.line().curve(curve).x(x).y(({figure}) => this.y(figure));
    return runsOf(points, this.data.head.marks.all, ({extent}) => extent !== null).flatMap((run) => [
      svg('path', {class: `band ${color}`, d: band(run)}),
      svg('path', {class: `line ${color}`, d: run.length > 1 ? through(extremes(run)) : `${through(extremes(run)).replace('Z', '')}h3`}),
    ]);
  }

  showChosen() {
    if (this.x === undefined) return;
    const {steady} = this.data.head.full;
    const [at, from] = ['at', 'from'].map((name) => steady[this.state.get(name)]);
    this.cursor.replaceChildren(...chosenLines({at, from}, this.x, TOP, HEIGHT - BOTTOM));
    this.tell(at);
  }

  // Of a stretch: of a moment, or of several.
  timeOf(stretch) {
    const [first, last] = stretch.map((time) => timeText(wallTime(this.data.head.points, time)));
    return first === last ? first : `${first} to ${last}`;
  }

  // Tells what the lines that are drawn are at a steady time, or in the stretch of moments nearest to
  // it, whose time it gives.
  tell(time) {
    const {times} = this.data.lines;
    const place = nearest(this.middles, time);
    const words = this.lines.filter((each) => each.isDrawn).map(({name, line, style}) => {
      const extent = line[place];
      const [least, greatest] = extent === null ? [NO_VALUE, NO_VALUE] : extent.map(style.text);
      return element('span', {}, nameView(shortText(name)), ` ${least === greatest ? least : `${least} to ${greatest}`}`);
    });
    this.told.replaceChildren(element('strong', {}, this.timeOf(times[place])), ' ', ...joined(words, ' · '));
    return this.middles[place];
  }
}
