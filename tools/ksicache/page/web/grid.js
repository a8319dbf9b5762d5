// A table that is sorted by its heads, filtered by a word and copied as CSV.
import {element} from './dom.js';

const SHOWN = 60; // rows, until more are asked for
const MORE = 1000; // that are added then: a browser lays out so many at once

// `columns`: {name, title, isNumber, compare(a, b), text(row), csv(row), class}; rows are whatever
// these take.
export class Grid {
  constructor(label) {
    this.label = label;
    this.filter = '';
    this.sorted = null; // the name of a column
    this.isDown = true;
    this.most = SHOWN;
    this.columns = [];
    this.texts = []; // of the rows that are drawn, the nodes of their cells
    this.head = element('tr');
    this.body = element('tbody');
    this.caption = element('p', {class: 'note'});
    this.found = element('span', {class: 'note', role: 'status'}); // how many rows the filter finds
    this.more = element('button', {type: 'button', class: 'more', onclick: () => this.showMore()});
    this.input = element('input', {type: 'search', 'aria-label': `Filter ${label}`, placeholder: 'Filter', oninput: () => this.search()});
    this.copied = element('span', {class: 'note', role: 'status'});
    this.tools = element('div', {class: 'tools'}, this.input,
      element('button', {type: 'button', onclick: () => this.copy()}, 'Copy as CSV'), this.found, this.copied);
    this.scroller = element('div', {class: 'scroller', tabindex: 0, role: 'region', 'aria-label': label},
      element('table', {class: 'grid', 'aria-label': label}, element('thead', {}, this.head), this.body));
    this.about = element('p', {class: 'about', 'aria-hidden': 'true'}); // a title that the keyboard shows, too
    this.view = element('div', {}, this.tools, this.caption, this.about, this.scroller, this.more);
  }

  // Shows other rows, or others of their columns. `lead`: [name, text] of what stands before each
  // row that is copied.
  show(columns, rows, caption, lead = []) {
    this.lead = lead;
    const namesOf = (all) => all.map(({name, isNumber}) => `${name} ${isNumber}`).join();
    if (namesOf(columns) !== namesOf(this.columns)) this.clear();
    this.columns = columns;
    this.rows = rows;
    this.text = caption;
    if (!columns.some((column) => column.name === this.sorted)) this.sorted = null;
    this.drawHead();
    this.draw();
  }

  clear() {
    this.body.replaceChildren();
    this.texts = [];
  }

  sortBy(name, isDown) {
    this.sorted = name;
    this.isDown = isDown;
  }

  search() {
    this.filter = this.input.value.toLowerCase();
    const count = this.draw();
    this.found.textContent = this.filter === '' ? '' : `${count} of ${this.rows.length} rows`;
  }

  // What was looked for in other rows is not looked for in these.
  clearFilter() {
    this.filter = '';
    this.input.value = '';
    this.found.textContent = '';
  }

  showMore() {
    this.most += MORE;
    this.draw();
    this.scroller.focus();
  }

  drawHead() {
    this.head.replaceChildren(...this.columns.map((column) => {
      const isSorted = column.name === this.sorted;
      const arrow = isSorted ? (this.isDown ? ' ▾' : ' ▴') : '';
      return element('th', {
        scope: 'col', class: column.isNumber ? 'number' : null,
        'aria-sort': isSorted ? (this.isDown ? 'descending' : 'ascending') : null,
      }, this.headButton(column, arrow));
    }));
  }

  headButton(column, arrow) {
    const tell = () => { this.about.textContent = `${column.name}: ${column.title}`; };
    return element('button', {
      type: 'button', title: column.title, onclick: () => this.turn(column), onfocus: tell, onpointerenter: tell,
    }, `${column.name}${arrow}`);
  }

  // Sorts by a column, numbers with the greatest first, or the other way round.
  turn(column) {
    this.sortBy(column.name, this.sorted === column.name ? !this.isDown : column.isNumber);
    this.drawHead();
    this.draw();
    this.head.children[this.columns.indexOf(column)].firstChild.focus();
  }

  // The rows as they are shown.
  chosen() {
    const {filter, columns} = this;
    const rows = filter === '' ? [...this.rows]
      : this.rows.filter((row) => columns.some((column) => column.text(row).toLowerCase().includes(filter)));
    const column = columns.find((each) => each.name === this.sorted);
    if (column === undefined) return rows;
    const sign = this.isDown ? -1 : 1;
    return rows.sort((a, b) => column.compare(a, b, sign));
  }

  // Gives how many rows the filter finds.
  draw() {
    const rows = this.chosen();
    const shown = rows.slice(0, this.most);
    this.drawRows(shown);
    const isAll = shown.length === rows.length;
    const count = rows.length !== this.rows.length ? `${rows.length} of ${this.rows.length} rows`
      : `${rows.length} ${rows.length === 1 ? 'row' : 'rows'}`;
    this.caption.textContent = `${this.text}: ${count}${isAll ? '' : `, the first ${shown.length} shown`}`;
    this.more.hidden = isAll;
    this.more.textContent = rows.length <= this.most + MORE ? `Show all ${rows.length} rows` : `Show ${MORE} more rows`;
    this.copied.textContent = '';
    return rows.length;
  }

  // Rows that are there take other texts, which is much less work for a browser than other rows.
  drawRows(rows) {
    while (this.texts.length > rows.length) {
      this.texts.pop();
      this.body.lastChild.remove();
    }
    while (this.texts.length < rows.length) this.addRow();
    rows.forEach((row, i) => this.columns.forEach((column, place) => {
      const node = this.texts[i][place];
      const text = column.text(row);
      if (node.data !== text) node.data = text;
    }));
  }

  addRow() {
    const texts = this.columns.map(() => document.createTextNode(''));
    this.body.append(element('tr', {}, ...this.columns.map((column, i) =>
      element(i === 0 ? 'th' : 'td', {scope: i === 0 ? 'row' : null, class: column.isNumber ? 'number' : null, dir: column.isNumber ? null : 'auto'}, texts[i]))));
    this.texts.push(texts);
  }

  // What is shown, all rows of it, as `ksicache export` writes it.
  csv() {
    const quoted = (text) => (/^ | $|[",\r\n]/.test(text) || text === '' ? `"${text.replaceAll('"', '""')}"` : text);
    const field = (text) => (text === null ? '' : quoted(text));
    const [names, lead] = [0, 1].map((place) => this.lead.map((each) => each[place]));
    const lines = [[...names, ...this.columns.map(({name}) => name)],
      ...this.chosen().map((row) => [...lead, ...this.columns.map((column) => column.csv(row))])];
    return `${lines.map((line) => line.map(field).join(',')).join('\n')}\n`;
  }

  // Texts that a spreadsheet would compute.
  formulas() {
    const texts = this.columns.filter((column) => !column.isNumber);
    return this.chosen().reduce((sum, row) => sum + texts.filter((column) => /^[=+\-@\t\r]/.test(column.csv(row) ?? '')).length, 0);
  }

  async copy() {
    try {
      await navigator.clipboard.writeText(this.csv());
      const formulas = this.formulas();
      this.copied.textContent = `${this.chosen().length} rows copied${formulas === 0 ? '' : `; ${formulas} of their texts would be formulas in a spreadsheet: paste them as text`}`;
    } catch {
      this.copied.textContent = 'This browser does not let the page copy';
    }
  }
}

const COLLATOR = new Intl.Collator('en', {numeric: true});

// Compares values of one column: those without one stand last, whichever way it is sorted.
export function compareValues(a, b, sign) {
  if (a === null || b === null) return (a === null) - (b === null);
  if (typeof a === 'string') return sign * COLLATOR.compare(a, b);
  return sign * (a < b ? -1 : a > b ? 1 : 0);
}
