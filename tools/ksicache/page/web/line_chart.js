// Figures of machines, groups, processes and heaps over time, as bands from the least to the
// greatest of each stretch of moments.
import {choice, element, svg} from './dom.js';
import {bytesOf, isMemory, memoryText, shownText, tickText, timeText} from './format.js';
import {Kind} from './tables.js';
import {isBreak, memoryTicks, tickTime} from './timeline.js';

const HEIGHT = 200;
const MARGIN = {left: 52, right: 26, top: 10, bottom: 22};
const OFFERED = 24; // lines to choose from
const DRAWN = 5; // at first
const COLORS = 8; // that lines can have
const TOGETHER = 'all together';

// The figures of a column as they are drawn: memory in bytes.
function toDraw(column) {
  return isMemory(column) ? (figure) => bytesOf(figure, column) : (figure) => figure;
}

// How the figures of a line are written.
function textOf(column) {
  return isMemory(column) ? memoryText : (figure) => `${figure}${column.kind === Kind.percent ? ' %' : ''}`;
}

// The lines of one figure: {name, line, text}, that of all together first if it is memory.
function linesOf(data, role) {
  const report = data.head.reports.find((each) => each.name === role.report);
  const column = report.columns.find((each) => each.name === role.column);
  if (column === undefined) return [];
  const found = data.lines.lines.get(`${role.report} ${role.column}`);
  const place = report.columns.filter((each) => each.isKey).findIndex((each) => each.name === data.nameOf.get(role.report));
  const [figure, text] = [toDraw(column), textOf(column)];
  const ofLine = (name, line) => ({name, line: line.map((extent) => extent && extent.map(figure)), text});
  const things = found.things.map(({keys, line}) => ofLine(shownText(data.head.texts[keys[place]] ?? data.head.host), line));
  return isMemory(column) && place >= 0 ? [ofLine(TOGETHER, found.together), ...things] : things;
}

function peak({line}) {
  return d3.max(line, (extent) => extent?.[1] ?? 0) ?? 0;
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

// The lines to choose from, and how many more there are.
function offered(data, role) {
  const lines = role === MOVED ? movedLines(data) : linesOf(data, role);
  const together = lines.filter(({name}) => name === TOGETHER);
  const things = lines.filter((each) => !together.includes(each) && peak(each) > 0);
  if (role !== MOVED) things.sort((a, b) => peak(b) - peak(a));
  return {lines: [...together, ...things.slice(0, OFFERED)], more: Math.max(0, things.length - OFFERED)};
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
      this.svg, this.list, this.told);
    state.watch(['at', 'from'], () => this.showChosen());
    new ResizeObserver(() => this.draw()).observe(this.svg);
    this.svg.addEventListener('pointermove', (event) => this.point(event));
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
    const {times} = this.data.lines;
    const drawn = this.lines.filter((each) => each.isDrawn);
    this.x = d3.scaleTime([times[0][0] / 1000, times.at(-1)[1] / 1000], [MARGIN.left, width - MARGIN.right]);
    const most = d3.max(drawn, (each) => d3.max(each.line, (extent) => extent?.[1] ?? 0)) || 1;
    this.y = d3.scaleLinear([0, most * 1.04], [HEIGHT - MARGIN.bottom, MARGIN.top]);
    const bottom = svg('g', {class: 'axis', transform: `translate(0,${HEIGHT - MARGIN.bottom})`});
    const left = svg('g', {class: 'axis', transform: `translate(${MARGIN.left},0)`});
    d3.axisBottom(this.x).tickFormat(tickTime).ticks(Math.max(2, Math.floor(width / 110))).tickSizeOuter(0)(d3.select(bottom));
    this.leftAxis(most).tickSizeOuter(0)(d3.select(left));
    this.cursor = svg('g', {class: 'cursor'});
    this.svg.setAttribute('viewBox', `0 0 ${width} ${HEIGHT}`);
    this.svg.replaceChildren(svg('title', {id: 'lines-name'}, `${this.role.title} over time`),
      bottom, left, ...drawn.flatMap((each) => this.paths(each)), this.cursor);
    this.showChosen();
  }

  leftAxis(most) {
    const axis = d3.axisLeft(this.y);
    const text = this.lines[0]?.text ?? memoryText;
    return text === memoryText ? axis.tickValues(memoryTicks(most)).tickFormat(tickText) : axis.ticks(4).tickFormat(text);
  }

  paths({line, color}) {
    const {times} = this.data.lines;
    const marks = this.data.head.marks.all;
    const runs = [[]];
    line.forEach((extent, i) => {
      if (extent === null || (i > 0 && isBreak(marks, times[i - 1][1], times[i][0]))) runs.push([]);
      if (extent !== null) runs.at(-1).push({x: this.x((times[i][0] + times[i][1]) / 2000), extent});
    });
    const band = d3.area().x((each) => each.x).y0((each) => this.y(each.extent[0])).y1((each) => this.y(each.extent[1]));
    const middle = d3.line().x((each) => each.x).y((each) => this.y((each.extent[0] + each.extent[1]) / 2));
    return runs.filter((run) => run.length > 0).flatMap((run) => [
      svg('path', {class: `band ${color}`, d: band(run)}),
      svg('path', {class: `line ${color}`, d: run.length > 1 ? middle(run) : `${middle(run).replace('Z', '')}h3`}),
    ]);
  }

  showChosen() {
    if (this.x === undefined) return;
    const {full} = this.data.head;
    const line = (moment, kind) => {
      const x = this.x(full[this.state.get(moment)] / 1000);
      return svg('line', {class: kind, x1: x, x2: x, y1: MARGIN.top, y2: HEIGHT - MARGIN.bottom});
    };
    this.cursor.replaceChildren(line('from', 'from'), line('at', 'at'));
    this.tell(full[this.state.get('at')]);
  }

  point(event) {
    if (this.x === undefined) return;
    this.tell(this.x.invert(event.clientX - this.svg.getBoundingClientRect().left).getTime() * 1000);
  }

  // What the lines that are drawn say of a time.
  tell(time) {
    const {times} = this.data.lines;
    const place = Math.max(0, times.findLastIndex((each) => each[0] <= time));
    const words = this.lines.filter((each) => each.isDrawn).map(({name, line, text}) => {
      const extent = line[place];
      if (extent === null) return `${name} –`;
      const [least, greatest] = extent.map(text);
      return `${name} ${least === greatest ? least : `${least} to ${greatest}`}`;
    });
    this.told.replaceChildren(element('strong', {}, timeText(times[place][0])), ` ${words.join(' · ')}`);
  }
}
