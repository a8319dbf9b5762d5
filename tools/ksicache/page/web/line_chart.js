// Figures of machines, groups, processes and heaps over time, as bands from the least to the
// greatest of each stretch of moments, and lines through both.
import {BOTTOM, chosenLines, clipped, figureAxis, listen, markShapes, memoryTicks, runsOf, timeAxis, timeScale, wallTime} from './chart.js';
import {choice, element, svg} from './dom.js';
import {bytesOf, isMemory, memoryText, shownText} from './format.js';
import {Kind} from './tables.js';
import {timeText} from './times.js';

const HEIGHT = 200;
const TOP = 10;
const OFFERED = 24; // lines to choose from
const DRAWN = 5; // at first
const COLORS = 8; // that lines can have
const TOGETHER = 'all together';

// How the figures of a column are drawn and written: {figure, text, most, ticks}; of what has a
// greatest one, `most` is it.
function styleOf(column, {states}) {
  const same = (figure) => figure;
  if (isMemory(column)) return {figure: (figure) => bytesOf(figure, column), text: memoryText, ticks: memoryTicks};
  if (column.kind === Kind.text) {
    const text = (state) => states[state];
    return {figure: same, text, most: states.length - 1, ticks: () => (axis) => axis.tickValues(d3.range(states.length)).tickFormat(text)};
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
  return isMemory(column) && data.nameOf.has(role.report) ? [ofLine(TOGETHER, found.together), ...things] : things;
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
    Object.assign(this, {data, state});
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

  choose(role) {
    this.role = role;
    Object.assign(this, offered(this.data, role));
    let things = 0;
    for (const each of this.lines) {
      const isTogether = each.name === TOGETHER;
      each.isDrawn = !isTogether && things < DRAWN;
      each.color = isTogether ? 'together' : `color${things++ % COLORS}`;
    }
    this.drawList();
    this.draw();
  }

  drawList() {
    const boxes = this.lines.map((each) => element('label', {},
      element('input', {type: 'checkbox', checked: each.isDrawn, onchange: (event) => {
        each.isDrawn = event.target.checked;
        this.draw();
      }}), element('span', {class: `swatch ${each.color}`}), element('span', {class: 'name'}, each.name)));
    const {title, report, column} = this.role;
    this.list.replaceChildren(element('legend', {}, report === undefined ? title : `${title}, ${report} ${column}`), ...boxes);
    if (this.more > 0) this.list.append(element('span', {class: 'note'}, `and ${this.more} smaller ones`));
    if (boxes.length === 0) this.list.append(element('span', {class: 'note'}, 'none of these has had any'));
  }

  draw() {
    const width = this.svg.clientWidth;
    if (width === 0) return;
    const {head, lines} = this.data;
    const drawn = this.lines.filter((each) => each.isDrawn);
    const {ticks, most = this.mostOf(drawn)} = this.lines[0]?.style ?? {ticks: memoryTicks};
    this.x = timeScale(...this.state.get('zoom') ?? [lines.times[0][0], lines.times.at(-1)[1]], width);
    this.y = d3.scaleLinear([0, most * 1.04], [HEIGHT - BOTTOM, TOP]);
    this.cursor = svg('g', {class: 'cursor'});
    this.svg.setAttribute('viewBox', `0 0 ${width} ${HEIGHT}`);
    this.svg.replaceChildren(svg('title', {id: 'lines-name'}, `${this.role.title} over time`),
      timeAxis(this.x, head.points, width, HEIGHT), figureAxis(this.y, ticks(most)),
      ...clipped('lines-sight', width, HEIGHT, ...markShapes(head.marks.all, this.x, TOP, HEIGHT),
        ...drawn.flatMap((each) => this.paths(each)), this.cursor));
    this.showChosen();
  }

  mostOf(lines) {
    return d3.max(lines, peak) || 1;
  }

  paths({line, color}) {
    const points = line.map((extent, i) => ({from: this.data.lines.times[i][0], to: this.data.lines.times[i][1], extent}));
    const x = (point) => this.x(point.time / 1000);
    const band = d3.area().x(x).y0(({extent}) => this.y(extent[0])).y1(({extent}) => this.y(extent[1]));
    const through = d3.line().x(x).y(({figure}) => this.y(figure));
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

  // What the lines that are drawn say of a time.
  tell(time) {
    const {times} = this.data.lines;
    const place = Math.max(0, times.findLastIndex((each) => each[0] <= time));
    const words = this.lines.filter((each) => each.isDrawn).map(({name, line, style}) => {
      const extent = line[place];
      if (extent === null) return `${name} –`;
      const [least, greatest] = extent.map(style.text);
      return `${name} ${least === greatest ? least : `${least} to ${greatest}`}`;
    });
    this.told.replaceChildren(element('strong', {}, timeText(wallTime(this.data.head.points, times[place][0]))), ` ${words.join(' · ')}`);
  }
}
