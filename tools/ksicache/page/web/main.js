// Puts the page together, once its data is unpacked.
import {canLoad, load} from './data.js';
import {readTables} from './tables.js';
import {readLines} from './lines.js';
import {leastFree, memoryOf} from './memory.js';
import {element} from './dom.js';
import {header} from './header.js';
import {addressed, keepAddress} from './address.js';
import {State} from './state.js';
import {Treemap} from './treemap.js';
import {Timeline} from './timeline.js';
import {LineChart} from './line_chart.js';
import {Changes} from './changes.js';
import {Reports} from './reports.js';
import {setHostZone} from './times.js';

// The moments that the balance is drawn from, {taken, steady, rows}, `rows` being the host's: those
// that are in the page for it, and those in full.
function balanceMoments(head, ofPoints, moments, hostReport) {
  const momentsOf = ({taken, steady}, rowsOf) => steady.map((time, i) => ({taken: taken[i], steady: time, rows: rowsOf(i)}));
  const points = momentsOf(head.points, (i) => ofPoints[i][0]);
  const known = new Set(head.points.steady);
  const others = momentsOf(head.full, (i) => moments[i][hostReport]).filter(({steady}) => !known.has(steady));
  return [...points, ...others].sort((a, b) => a.steady - b.steady);
}

// All that the page shows: {head, balance, moments, memory, lines, nameOf}.
function unpacked({head, points, tables, lines}) {
  const {reports, roles, texts} = head;
  const hostReport = reports.findIndex((report) => report.name === roles.report);
  const hostRows = readTables(points, [reports[hostReport]], head.points.taken.length, texts);
  const moments = readTables(tables, [...reports, head.memory], head.full.taken.length, texts);
  return {
    head,
    balance: balanceMoments(head, hostRows, moments, hostReport),
    moments,
    memory: moments.map((streams) => memoryOf(streams[reports.length], head.parts)),
    lines: readLines(lines, head.lines),
    nameOf: new Map(roles.things.map((role) => [role.report, role.name])),
  };
}

// The moment with the least free memory, compared with the first one; if it is that, with the last.
function firstChoice(data) {
  const last = data.head.full.taken.length - 1;
  const at = leastFree(data) ?? last;
  return {at, from: at === 0 ? last : 0};
}

function show(data) {
  const {head} = data;
  setHostZone(head.zone);
  const hasMany = head.full.taken.length > 1;
  const state = new State({...firstChoice(data), ...addressed(data), zoom: null});
  const treemap = new Treemap(data, state);
  const changes = hasMany ? new Changes(data, state) : null;
  const reports = new Reports(data, state);
  const timeline = hasMany ? new Timeline(data, state) : null;
  const lines = hasMany ? new LineChart(data, state) : null;
  const views = [timeline, treemap, lines, changes, reports].filter((view) => view !== null);
  document.getElementById('page').replaceChildren(header(data, state), element('main', {}, ...views.map((view) => view.view)),
    element('footer', {class: 'note'}, 'Made by ksicache page. Charts by d3, © Mike Bostock; its license stands in the source of this page.'));
  for (const view of [treemap, changes, reports]) view?.show();
  keepAddress(data, state);
  document.documentElement.dataset.ready = 'yes';
  performance.mark('shown');
}

async function main() {
  if (!canLoad()) {
    document.getElementById('damaged').remove();
    document.getElementById('summary').prepend(element('p', {role: 'alert'}, 'This browser cannot unpack the data of this page; one of 2023 or later shows all of it.'));
    return;
  }
  const alarm = document.getElementById('damaged');
  let data;
  try {
    data = unpacked(await load());
  } catch {
    alarm.classList.add('told');
    return;
  }
  try {
    show(data);
  } catch (error) {
    alarm.textContent = `This page cannot be shown: ${error}.`;
    alarm.classList.add('told');
    throw error;
  }
}

main();
