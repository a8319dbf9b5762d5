// Puts the page together, once its data is unpacked.
import {canLoad, load} from './data.js';
import {readTables} from './tables.js';
import {readLines} from './lines.js';
import {memoryOf} from './memory.js';
import {element} from './dom.js';
import {header, tightest} from './header.js';
import {State} from './state.js';
import {Treemap} from './treemap.js';
import {Timeline} from './timeline.js';
import {LineChart} from './line_chart.js';
import {Changes} from './changes.js';
import {Reports} from './reports.js';
import {setHostZone} from './times.js';

// All that the page shows: {head, points, moments, memory, lines, hostReport, nameOf}.
function unpacked({head, points, tables, lines}) {
  const {reports, roles, texts} = head;
  const hostReport = reports.findIndex((report) => report.name === roles.report);
  const hostRows = readTables(points, [reports[hostReport]], head.points.taken.length, texts);
  const moments = readTables(tables, [...reports, head.memory], head.full.taken.length, texts);
  return {
    head,
    hostReport,
    // As if they were moments of which there is only the host's report.
    points: hostRows.map(([rows]) => {
      const moment = [];
      moment[hostReport] = rows;
      return moment;
    }),
    moments,
    memory: moments.map((streams) => memoryOf(streams[reports.length], head.parts)),
    lines: readLines(lines, head.lines),
    nameOf: new Map(roles.things.map((role) => [role.report, role.name])),
  };
}

function show(data) {
  const {head} = data;
  setHostZone(head.zone);
  const hasMany = head.full.taken.length > 1;
  const state = new State({at: tightest(data), from: 0, zoom: null});
  const treemap = new Treemap(data, state);
  const changes = hasMany ? new Changes(data, state) : null;
  const reports = new Reports(data, state);
  const timeline = hasMany ? new Timeline(data, state) : null;
  const lines = hasMany ? new LineChart(data, state) : null;
  const views = [timeline, treemap, lines, changes, reports].filter((view) => view !== null);
  document.getElementById('page').replaceChildren(header(data, state), element('main', {}, ...views.map((view) => view.view)),
    element('footer', {class: 'note'}, 'Made by ksicache page. Charts by d3, © Mike Bostock; its license stands in the source of this page.'));
  for (const view of [treemap, changes, reports]) view?.show();
  document.documentElement.dataset.ready = 'yes';
  performance.mark('shown');
}

async function main() {
  if (!canLoad()) {
    document.getElementById('damaged').remove();
    document.getElementById('summary').prepend(element('p', {role: 'alert'}, 'This browser cannot unpack the data of this page; one of 2023 or later shows all of it.'));
    return;
  }
  try {
    show(unpacked(await load()));
  } catch (error) {
    const alarm = document.getElementById('damaged');
    if (alarm === null) throw error;
    alarm.classList.add('told');
  }
}

main();
