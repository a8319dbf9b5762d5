// Every report of the chosen moment as a table.
import {choice, element} from './dom.js';
import {NO_VALUE, UNITS, isMemory, shownValue} from './format.js';
import {Grid, compareValues} from './grid.js';
import {Kind} from './tables.js';
import {isoText, timeText} from './times.js';

const OWN_UNIT = '';

function isNumber(column) {
  return column.kind !== Kind.text && column.kind !== Kind.flag;
}

export class Reports {
  constructor(data, state) {
    this.data = data;
    this.state = state;
    this.place = 0;
    this.unit = OWN_UNIT;
    this.hidden = new Set(); // "report column"
    this.grid = new Grid('rows of the report');
    this.columns = element('div', {class: 'columns'});
    this.names = element('input', {type: 'text', spellcheck: 'false', autocomplete: 'off', onchange: () => this.select()});
    this.unknown = element('span', {class: 'note', role: 'status'});
    const {reports} = data.head;
    const units = Object.entries(UNITS).map(([word, {title}]) => [word, title]);
    this.view = element('section', {class: 'reports', 'aria-labelledby': 'reports'},
      element('h2', {id: 'reports'}, 'All reports'),
      element('div', {class: 'tools'},
        choice('Report', reports.map((report, i) => [String(i), report.name]), '0', (value) => this.choose(Number(value))),
        choice('Memory in', [[OWN_UNIT, 'its own unit'], ...units], OWN_UNIT, (unit) => {
          this.unit = unit;
          this.show();
        })),
      element('details', {}, element('summary', {}, 'Columns'),
        element('div', {class: 'tools'}, element('label', {class: 'names'}, 'Names as with -s, empty for all ', this.names), this.unknown),
        this.columns), this.grid.view);
    state.watch(['at'], () => this.show());
    this.drawColumns();
  }

  choose(place) {
    this.place = place;
    this.grid.sortBy(null, true);
    this.grid.clearFilter();
    this.grid.scroller.scrollTo(0, 0);
    this.drawColumns();
    this.show();
  }

  report() {
    return this.data.head.reports[this.place];
  }

  isHidden(column) {
    return this.hidden.has(`${this.report().name} ${column.name}`);
  }

  turn(column, box) {
    const name = `${this.report().name} ${column.name}`;
    const isEmpty = this.report().columns.every((each) => each === column || this.isHidden(each));
    box.checked ||= isEmpty;
    this.hidden[box.checked ? 'delete' : 'add'](name);
    this.nameColumns();
    this.unknown.textContent = isEmpty ? 'One column stays' : '';
    this.show();
  }

  // Shows the columns that are named, "name:consumed".
  select() {
    const wanted = this.names.value.split(':').map((name) => name.trim().toLowerCase()).filter((name) => name !== '');
    const {name: report, columns} = this.report();
    const isKnown = (name) => columns.some((column) => column.name.toLowerCase() === name);
    const unknown = wanted.filter((name) => !isKnown(name));
    this.unknown.textContent = unknown.length === 0 ? '' : `${report} has no column ${unknown.join(', ')}`;
    if (unknown.length > 0) return;
    for (const column of columns) {
      const isShown = wanted.length === 0 || wanted.includes(column.name.toLowerCase());
      this.hidden[isShown ? 'delete' : 'add'](`${report} ${column.name}`);
    }
    this.drawColumns();
    this.show();
  }

  nameColumns() {
    const {columns} = this.report();
    const shown = columns.filter((column) => !this.isHidden(column));
    this.names.value = shown.length === columns.length ? '' : shown.map((column) => column.name).join(':');
    this.unknown.textContent = '';
  }

  drawColumns() {
    this.nameColumns();
    this.columns.replaceChildren(...this.report().columns.map((column) => element('label', {},
      element('input', {type: 'checkbox', checked: !this.isHidden(column), onchange: (event) => this.turn(column, event.target)}),
      element('b', {}, column.name), ` ${column.description.trim()}`)));
  }

  // "memory in KB", of what is shown.
  unitText(columns) {
    const memory = columns.filter(isMemory);
    const titles = this.unit === OWN_UNIT ? [...new Set(memory.map(({unit}) => unit))] : [UNITS[this.unit].title];
    return memory.length === 0 ? '' : `, memory in ${titles.join(' and ')}`;
  }

  columnOf(column, place) {
    const unit = this.unit === OWN_UNIT ? null : this.unit;
    const title = isMemory(column) && unit !== null ? UNITS[unit].title : column.unit;
    return {
      name: column.name,
      title: `${column.description.trim()}${title === '' ? '' : ` (${title})`}`,
      isNumber: isNumber(column),
      text: (row) => shownValue(row.values[place], column, unit),
      csv: (row) => {
        const value = row.values[place];
        if (column.kind === Kind.text) return value;
        const text = shownValue(value, column, unit);
        return text === NO_VALUE ? null : text;
      },
      compare: (a, b, sign) => compareValues(a.values[place], b.values[place], sign),
    };
  }

  show() {
    const at = this.state.get('at');
    const report = this.report();
    const rows = this.data.moments[at][this.place];
    const columns = report.columns.map((column, place) => ({column, place})).filter(({column}) => !this.isHidden(column));
    const time = timeText(this.data.head.full.taken[at]);
    const caption = `${report.name} at ${time}${rows === null ? ' could not be read' : this.unitText(columns.map(({column}) => column))}`;
    const lead = [['host', this.data.head.host], ['time', isoText(this.data.head.full.taken[at])]];
    this.grid.show(columns.map(({column, place}) => this.columnOf(column, place)), rows ?? [], caption, lead);
  }
}
