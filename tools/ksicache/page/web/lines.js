// Figures over time, out of the numbers that tools/ksicache/page/lines.h describes.
import {plus, unfolded} from './bytes.js';

// An array with, for each stretch, [least, greatest], or null where there is no figure.
function readLine(bytes, stretches) {
  const scale = 2 ** bytes.number();
  const line = new Array(stretches).fill(null);
  let before = 0;
  for (let i = 0; i < stretches; ++i) {
    const code = bytes.number();
    if (code === 0) continue;
    before = plus(before, unfolded(plus(code, -1)));
    line[i] = [Number(before) * scale, 0];
  }
  for (const extent of line) {
    if (extent !== null) extent[1] = extent[0] + Number(bytes.number()) * scale;
  }
  return line;
}

// The times of the stretches, us since 1970, and the lines: by report and column that of all rows
// together and those of the things by their names.
export function readLines(bytes, head) {
  const {stretches, reports} = head;
  const times = readLine(bytes, stretches);
  const lines = new Map();
  for (const report of reports) {
    for (const column of report.columns) {
      const together = readLine(bytes, stretches);
      const things = report.things.map((name) => ({name, line: readLine(bytes, stretches)}));
      lines.set(`${report.report} ${column}`, {together, things, leavesOut: report.leavesOut});
    }
  }
  return {times, lines};
}
