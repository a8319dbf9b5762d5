// What changed between the two chosen moments, as `ksicache diff` has it.
import {choice, element} from './dom.js';
import {NO_VALUE, UNITS, shownText, signedText} from './format.js';
import {byGrowth, compared} from './comparison.js';
import {Grid, compareValues} from './grid.js';
import {isoText, timeText} from './times.js';

const HOST = [['total', 'Total'], ['free', 'Free'], ['used', 'In use'], ['kernel', 'Kernel'], ['caches', 'Caches'], ['others', 'Others']];

// What an indented figure of the host is part of.
const INNER = ['kernel', 'caches', 'others'];

function numberText(number) {
  return number === null ? NO_VALUE : String(number);
}

// The part of the growth of what is in use; a half is rounded to what is even.
function partText(part, whole) {
  if (part === null || whole === null || whole === 0n) return NO_VALUE;
  if (part === 0n) return '0%';
  const percent = 100 * Number(part) / Number(whole);
  if (Math.abs(percent) < 0.5) return '<1%';
  const below = Math.floor(percent);
  const rest = percent - below;
  return `${rest > 0.5 || (rest === 0.5 && below % 2 !== 0) ? below + 1 : below}%`;
}

function cells(...texts) {
  return texts.map((text) => element('td', {class: 'number'}, text));
}

function figureRow(title, figure, whole, attributes = {}) {
  return element('tr', attributes, element('th', {scope: 'row'}, title),
    ...cells(numberText(figure.before), numberText(figure.after), signedText(figure.growth), partText(figure.growth, whole)));
}

function scroller(label, table) {
  return element('div', {class: 'scroller', tabindex: 0, role: 'region', 'aria-label': label}, table);
}

// What one column of the table of things shows, sorts by and copies.
const COLUMNS = [
  {name: 'what', title: 'Of which kind it is', key: 'kind'},
  {name: 'name', title: 'Its name', key: 'name'},
  {name: 'group', title: "The kernel's number of its group", key: 'number', isNumber: true},
  {name: 'state', title: 'Whether it is new, gone or has changed', key: 'state'},
  {name: 'before', title: 'Memory at the earlier moment', key: 'before', isNumber: true},
  {name: 'after', title: 'Memory at the later moment', key: 'after', isNumber: true},
  {name: 'growth', title: 'How much more it has', key: 'growth', isNumber: true},
];

// Percent of the growth of what is in use.
function partColumn(whole) {
  return {
    name: 'part', title: 'How much of the growth of what is in use that is', isNumber: true,
    text: (row) => partText(row.growth, whole),
    csv: (row) => (partText(row.growth, whole) === NO_VALUE ? null : (100 * Number(row.growth) / Number(whole)).toFixed(1)),
    compare: (a, b, sign) => compareValues(a.growth, b.growth, whole !== null && whole < 0n ? -sign : sign),
  };
}

function columnOf({name, title, key, isNumber = false}) {
  return {
    name, title, isNumber,
    text: (row) => (key === 'growth' ? signedText(row.growth) : isNumber ? numberText(row[key]) : shownText(row[key])),
    csv: (row) => (row[key] === null ? null : String(row[key])),
    compare: (a, b, sign) => compareValues(a[key], b[key], sign),
  };
}

export class Changes {
  constructor(data, state) {
    Object.assign(this, {data, state, kind: '', unit: 'mb'});
    this.grid = new Grid('things that changed');
    this.host = element('table', {class: 'balance'});
    this.who = element('table', {class: 'balance'});
    this.note = element('p', {class: 'note'});
    this.view = element('section', {class: 'changes', 'aria-labelledby': 'changes'},
      element('h2', {id: 'changes'}, 'What changed'), this.note,
      element('div', {class: 'pair'}, scroller('The host', this.host), scroller('Who explains it', this.who)),
      element('div', {class: 'tools'}, this.kinds(), this.units()), this.grid.view);
    state.watch(['at', 'from'], () => this.show());
  }

  kinds() {
    const {parts} = this.data.head;
    const added = parts.filter((part) => part.isAdded).length;
    return choice('Of', [['', `all ${added} kinds that add up`], ...parts.map((part) => [part.name, part.name])], '', (kind) => {
      this.kind = kind;
      this.showThings();
    });
  }

  units() {
    return choice('Changes in', Object.entries(UNITS).map(([word, {title}]) => [word, title]), this.unit, (unit) => {
      this.unit = unit;
      this.show();
    });
  }

  show() {
    const {head, memory} = this.data;
    const [from, at] = ['from', 'at'].map((name) => this.state.get(name)).sort((a, b) => a - b);
    this.moments = [from, at];
    const [bootFrom, bootAt] = [head.boots[from], head.boots[at]];
    const isRebooted = bootFrom !== 0 && bootAt !== 0 && bootFrom !== bootAt;
    this.times = `${timeText(head.full.taken[from])} to ${timeText(head.full.taken[at])}`;
    this.result = compared(memory[from], memory[at], head.parts, UNITS[this.unit].shift, !isRebooted);
    this.note.textContent = `From ${this.times}, in ${UNITS[this.unit].title}.${isRebooted ? ' The host was started anew in between: groups and processes are matched by their names.' : ''}`;
    this.showHost();
    this.showThings();
  }

  showHost() {
    const {host, parts, nobody} = this.result;
    const whole = host.used.growth;
    const isShown = ({before, after, unknown, things, isKnown}) => !isKnown || before !== 0n || after !== 0n || unknown > 0 || things.length > 0;
    this.fill(this.host, 'the host', HOST.map(([key, title]) =>
      figureRow(title, host[key], key === 'total' || key === 'free' ? null : whole, {class: INNER.includes(key) ? 'inner' : null})));
    this.fill(this.who, 'who explains it', [
      ...parts.filter((part) => part.info.isAdded && isShown(part)).map((part) => this.partRow(part, whole)),
      element('tr', {}, element('th', {scope: 'row'}, 'nobody'), ...cells('', '', signedText(nobody), partText(nobody, whole)))]);
  }

  fill(table, title, rows) {
    table.replaceChildren(element('thead', {}, element('tr', {}, ...[title, 'before', 'after', 'growth', 'part'].map((name, i) =>
      element('th', {scope: 'col', class: i === 0 ? null : 'number'}, name)))), element('tbody', {}, ...rows));
  }

  partRow(part, whole) {
    const title = part.isKnown ? `${part.count} ${part.info.name}` : `${part.info.name}: not known`;
    const rest = part.unknown === 0 ? '' : `, ${part.unknown} more without a figure, not added`;
    return figureRow(`${title}${rest}`, part, whole);
  }

  // Of which moments, and in which unit, what is copied is.
  lead(unit) {
    const [from, to] = this.moments.map((moment) => isoText(this.data.head.full.taken[moment]));
    return [['host', this.data.head.host], ['from', from], ['to', to], ['unit', unit]];
  }

  showThings() {
    const parts = this.result.parts.filter(({info}) => (this.kind === '' ? info.isAdded : info.name === this.kind));
    // Until they are sorted, those come first that changed most, whichever way.
    const things = parts.flatMap((part) => part.things).sort(byGrowth);
    const {title} = UNITS[this.unit];
    const unknown = parts.filter((part) => !part.isKnown).map(({info}) => info.name);
    const missing = unknown.length === 0 ? '' : `, ${unknown.join(' and ')} not known`;
    this.grid.show([...COLUMNS.map(columnOf), partColumn(this.result.host.used.growth)], things, `${this.times}, ${title}${missing}`, this.lead(title));
  }
}
