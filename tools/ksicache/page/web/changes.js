// What changed between the two chosen moments: things by their growth.
import {Rows} from './balance.js';
import {choice, element} from './dom.js';
import {growthText, memoryText, percentText, shownText, timeText} from './format.js';
import {Grid, compareValues} from './grid.js';

// The things of a report at two moments, by what they are, not by their place.
function compared(data, role, from, at) {
  const rows = (moment) => new Rows(data, moment, role.report);
  const before = rows(from);
  const after = rows(at);
  const size = (all, row) => role.sizes.reduce((sum, name) => {
    const bytes = all.bytes(row, name);
    return sum === null || bytes === null ? null : sum + bytes;
  }, 0);
  const pairs = new Map();
  const put = (all, which) => all.rows.forEach((row) => {
    const pair = pairs.get(row.id) ?? {kind: role.title, name: shownText(all.value(row, role.name)), before: null, after: null, was: false, is: false};
    pair[which] = size(all, row);
    pair[which === 'before' ? 'was' : 'is'] = true;
    pairs.set(row.id, pair);
  });
  put(before, 'before');
  put(after, 'after');
  return [...pairs.values()].map((pair) => ({...pair, growth: growthOf(pair), what: pair.was ? (pair.is ? '' : 'gone') : 'new'}));
}

function growthOf({before, after, was, is}) {
  if ((was && before === null) || (is && after === null)) return null;
  return (after ?? 0) - (before ?? 0);
}

// Of the host itself: the parts of its balance.
function balance(data, from, at) {
  const {roles} = data.head;
  const [before, after] = [from, at].map((moment) => new Rows(data, moment, roles.report));
  if (before.rows.length === 0 || after.rows.length === 0) return [];
  return roles.parts.map((part) => {
    const [was, is] = [before.bytes(before.rows[0], part.column), after.bytes(after.rows[0], part.column)];
    return {title: part.title, before: was, after: is, growth: was === null || is === null ? null : is - was};
  });
}

const COLUMNS = [
  {name: 'kind', title: 'What it is', key: 'kind', isNumber: false},
  {name: 'name', title: 'Its name', key: 'name', isNumber: false},
  {name: 'before', title: 'Memory at the earlier moment', key: 'before', isNumber: true},
  {name: 'after', title: 'Memory at the later moment', key: 'after', isNumber: true},
  {name: 'growth', title: 'How much more it has', key: 'growth', isNumber: true},
  {name: '', title: 'Whether it is new or gone', key: 'what', isNumber: false},
];

function columnOf({name, title, key, isNumber}) {
  const text = (row) => (!isNumber ? row[key] : key === 'growth' ? growthText(row[key]) : memoryText(row[key]));
  return {
    name, title, isNumber, text,
    csv: (row) => (row[key] === null ? null : String(row[key])),
    compare: (a, b, sign) => (key === 'growth' && a.growth !== null && b.growth !== null
      ? sign * (Math.abs(a.growth) - Math.abs(b.growth)) : compareValues(a[key], b[key], sign)),
  };
}

export class Changes {
  constructor(data, state) {
    this.data = data;
    this.state = state;
    this.kind = '';
    this.grid = new Grid('things that changed');
    this.grid.sortBy('growth', true);
    this.host = element('table', {class: 'balance'});
    const kinds = data.head.roles.things.map((role) => [role.key, role.title]);
    this.view = element('section', {class: 'changes', 'aria-labelledby': 'changes'},
      element('h2', {id: 'changes'}, 'What changed'), element('div', {class: 'scroller', tabindex: 0, role: 'region', 'aria-label': 'The host'}, this.host),
      choice('Of', [['', 'machines, processes and heaps'], ...kinds], '', (kind) => {
        this.kind = kind;
        this.show();
      }), this.grid.view,
      element('p', {class: 'note'}, 'Sorted by the size of the change. Groups contain machines and processes, and are shown by themselves.'));
    state.watch(['at', 'from'], () => this.show());
  }

  show() {
    const [from, at] = ['from', 'at'].map((name) => this.state.get(name)).sort((a, b) => a - b);
    const {full, roles} = this.data.head;
    const times = `${timeText(full[from])} to ${timeText(full[at])}`;
    this.showHost(balance(this.data, from, at), times);
    const things = roles.things
      .filter((role) => (this.kind === '' ? role.key !== 'groups' : role.key === this.kind))
      .flatMap((role) => compared(this.data, role, from, at))
      .filter((pair) => pair.growth !== 0);
    this.grid.show(COLUMNS.map(columnOf), things, times);
  }

  showHost(parts, times) {
    const total = parts.reduce((sum, part) => sum + Math.max(part.growth ?? 0, 0), 0);
    const row = ({title, before, after, growth}) => element('tr', {}, element('th', {scope: 'row'}, title),
      ...[memoryText(before), memoryText(after), growthText(growth), growth > 0 ? percentText(growth, total) : ''].map((text) => element('td', {class: 'number'}, text)));
    this.host.replaceChildren(element('caption', {}, `The host, ${times}`),
      element('thead', {}, element('tr', {}, ...['part', 'before', 'after', 'growth', 'of all growth'].map((name, i) => element('th', {scope: 'col', class: i === 0 ? null : 'number'}, name)))),
      element('tbody', {}, ...parts.map(row)));
  }
}
