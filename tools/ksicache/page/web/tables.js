// The rows of reports at moments, out of the numbers that tools/ksicache/page/table_stream.h
// describes.
import {narrow, plus, unfolded} from './bytes.js';

// The kinds of columns, as framework/column.h counts them.
export const Kind = {
  text: 0, flag: 1, id: 2, code: 3, count: 4, percent: 5, time: 6, microseconds: 7, kilobytes: 8,
  pages: 9, bytes: 10,
};

function isNumber(value) {
  return typeof value === 'number' || typeof value === 'bigint';
}

// In 64 bits, as the column has them.
function wrapped(value, isSigned) {
  return narrow(isSigned ? BigInt.asIntN(64, value) : BigInt.asUintN(64, value));
}

function sum(base, difference, isSigned) {
  const value = plus(base, difference);
  return typeof value === 'number' && (isSigned || value >= 0) ? value : wrapped(BigInt(value), isSigned);
}

// One report's rows, moment after moment.
class Reader {
  constructor(report, texts) {
    this.columns = report.columns;
    this.texts = texts;
    this.before = report.columns.map(() => []);
  }

  // The rows of the next moment; null if the report could not be read.
  next(bytes) {
    const state = bytes.number();
    if (state === 0) return null;
    const ids = this.ids(bytes, state - 1);
    const rows = ids.map((id) => ({id, values: new Array(this.columns.length)}));
    this.columns.forEach((column, place) => this.column(bytes, column, place, rows));
    return rows;
  }

  ids(bytes, count) {
    const ids = [];
    for (let i = 0; i < count; ++i) {
      ids.push((i === 0 ? 0 : ids[i - 1] + 1) + unfolded(bytes.number()));
    }
    return ids;
  }

  column(bytes, column, place, rows) {
    const before = this.before[place];
    let above = null;
    for (const row of rows) {
      const base = before[row.id] ?? above;
      const value = this.value(bytes, column, base);
      row.values[place] = value;
      before[row.id] = value;
      above = value;
    }
  }

  value(bytes, column, base) {
    const code = bytes.number();
    if (code === 1) return null;
    if (column.kind === Kind.text) return code === 0 ? base : this.texts[code - 3];
    if (column.kind === Kind.flag) return code === 0 ? base : code === 4;
    const from = isNumber(base) ? base : 0;
    if (code === 0) return from;
    if (code === 2) return wrapped(bytes.whole(), column.isSigned);
    const folded = typeof code === 'bigint' ? narrow(code - 2n) : code - 2;
    return sum(from, unfolded(folded), column.isSigned);
  }
}

// The rows of `reports` at `count` moments: of each moment an array of the rows of each report.
export function readTables(bytes, reports, count, texts) {
  const readers = reports.map((report) => new Reader(report, texts));
  const moments = [];
  for (let i = 0; i < count; ++i) moments.push(readers.map((reader) => reader.next(bytes)));
  return moments;
}
