// Puts the page together, once its data is unpacked.
import {canLoad, load} from './data.js';
import {readTables} from './tables.js';
import {readLines} from './lines.js';
import {element} from './dom.js';
import {ZONE, shownText, spanText, timeText} from './format.js';
import {State} from './state.js';
import {Treemap} from './treemap.js';
import {Timeline, markText} from './timeline.js';
import {LineChart} from './line_chart.js';
import {Changes} from './changes.js';
import {Reports} from './reports.js';

// All that the page shows: {head, points, moments, lines, hostReport, nameOf}.
function unpacked({head, points, tables, lines}) {
  const {reports, roles, texts} = head;
  const hostReport = reports.findIndex((report) => report.name === roles.report);
  const hostRows = readTables(points, [reports[hostReport]], head.points.length, texts);
  return {
    head,
    hostReport,
    // As if they were moments of which there is only the host's report.
    points: hostRows.map(([rows]) => {
      const moment = [];
      moment[hostReport] = rows;
      return moment;
    }),
    moments: readTables(tables, reports, head.full.length, texts),
    lines: readLines(lines, head.lines),
    nameOf: new Map(roles.things.map((role) => [role.report, role.name])),
  };
}

function count(number, one, many) {
  return `${number} ${number === 1 ? one : many}`;
}

// How much of what was recorded the page shows.
function extentText({moments, full, points, lines}) {
  const first = points[0];
  const last = points.at(-1);
  if (moments === 1) return timeText(first);
  const span = `${timeText(first)} to ${timeText(last)}, ${count(moments, 'moment', 'moments')} in ${spanText(last - first)}`;
  if (full.length === moments) return `${span}, all of them in full`;
  const cut = lines.isCut ? ', to 1/256 of its range' : '';
  return `${span}. Shown in full: ${full.length} of them, those with the least free memory in each stretch and those after a gap or restart. The balance is drawn from ${points.length} moments, the least and the most free memory of each stretch; a line from the least and the greatest figure of each of ${lines.stretches} stretches${cut}.`;
}

function remarks({marks, problems}) {
  const items = marks.all.map((mark) => `${timeText(mark.at)}: ${markText(mark)}`);
  if (marks.leftOut > 0) items.push(`and ${marks.leftOut} more of these`);
  if (marks.refused > 0) items.push(`up to ${marks.refused} reads of a moment were refused for want of rights`);
  if (marks.failed > 0) items.push(`up to ${marks.failed} reads of a moment failed`);
  if (marks.lossy > 0) items.push(`of ${count(marks.lossy, 'moment', 'moments')} something was left out`);
  items.push(...problems.map(shownText));
  if (items.length === 0) return null;
  return element('details', {class: 'remarks', open: items.length < 4}, element('summary', {}, count(items.length, 'remark', 'remarks')),
    element('ul', {}, ...items.map((item) => element('li', {}, item))));
}

function header(head) {
  return element('header', {},
    element('h1', {}, shownText(head.title)),
    element('p', {}, element('b', {}, shownText(head.host)), ` · ${extentText(head)}`),
    element('p', {class: 'note'}, `Times are those of ${ZONE}, with UTC, which the reports have, beside them.`),
    remarks(head));
}

function show(data) {
  const {head} = data;
  const state = new State({at: head.full.length - 1, from: 0});
  const hasMany = head.full.length > 1;
  const treemap = new Treemap(data, state);
  const changes = hasMany ? new Changes(data, state) : null;
  const reports = new Reports(data, state);
  const timeline = hasMany ? new Timeline(data, state) : null;
  const lines = hasMany ? new LineChart(data, state) : null;
  const views = [timeline, treemap, lines, changes, reports].filter((view) => view !== null);
  document.getElementById('page').replaceChildren(header(head), element('main', {}, ...views.map((view) => view.view)),
    element('footer', {class: 'note'}, 'Made by ksicache page. Charts by d3, © Mike Bostock; its license stands in the source of this page.'));
  for (const view of [treemap, changes, reports]) view?.show();
  document.documentElement.dataset.ready = 'yes';
}

async function main() {
  if (!canLoad()) {
    document.getElementById('summary').prepend(element('p', {role: 'alert'}, 'This browser cannot unpack the data of this page; one of 2023 or later shows all of it.'));
    return;
  }
  show(unpacked(await load()));
}

main();
