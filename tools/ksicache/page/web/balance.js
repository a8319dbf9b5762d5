// How the memory of a host divides at one moment: a tree of parts whose sizes add up.
//
// A part is {name, key, bytes, source, children, share, note}: `key` is the style that it has,
// `source` says which report and columns it comes from, `share` by how much its children are drawn
// smaller than they are because together they would be larger than it.
import {bytesOf, shownText} from './format.js';

// Groups in groups that a page follows; those further down belong to the last one.
const DEEPEST = 64;

// The rows of one report at one moment, by the names of columns.
export class Rows {
  constructor(data, moment, name) {
    const place = data.head.reports.findIndex((report) => report.name === name);
    this.report = data.head.reports[place];
    this.rows = data.moments[moment][place] ?? [];
    this.places = new Map(this.report.columns.map((column, at) => [column.name, at]));
  }

  value(row, name) {
    return row.values[this.places.get(name)] ?? null;
  }

  bytes(row, name) {
    return bytesOf(this.value(row, name), this.report.columns[this.places.get(name)]);
  }
}

function part(name, key, bytes, source, children = []) {
  return {name, key, bytes, source, children, share: 1, note: ''};
}

function sumOf(parts) {
  return parts.reduce((sum, each) => sum + each.bytes, 0);
}

// Makes the children of a part as large as it is: what they leave has a name, and where they are
// more, because some memory is counted with several of them, they share it.
function settle(whole, restName) {
  if (whole.children.length === 0) return whole;
  const sum = sumOf(whole.children);
  if (sum < whole.bytes) {
    whole.children.push(part(restName, 'rest', whole.bytes - sum, `${whole.source} less all that is told apart`));
  } else if (sum > whole.bytes) {
    whole.share = whole.bytes / sum;
  }
  return whole;
}

// The things of a report that have a size; `unknown` counts those that have none.
function thingsOf(data, moment, role) {
  const rows = new Rows(data, moment, role.report);
  const things = {all: [], unknown: 0};
  for (const row of rows.rows) {
    const sizes = role.sizes.map((size) => rows.bytes(row, size));
    if (sizes[0] === null) {
      ++things.unknown;
      continue;
    }
    const bytes = sizes.reduce((sum, size) => sum + (size ?? 0), 0);
    const name = shownText(rows.value(row, role.name));
    const thing = part(name, role.key, bytes, `${role.report} ${role.sizes.join(' + ')}`);
    thing.id = role.id === null ? null : String(rows.value(row, role.id));
    thing.parent = role.parent === null ? null : String(rows.value(row, role.parent));
    things.all.push(thing);
  }
  return things;
}

function bySize(parts) {
  return parts.filter((each) => each.bytes > 0).sort((a, b) => b.bytes - a.bytes);
}

// Machines and processes in the tree of groups.
class Groups {
  constructor(groups) {
    this.groups = new Map(groups.map((group) => [group.id, {group, below: [], things: []}]));
    this.top = {group: null, below: [], things: []};
    for (const [id, each] of this.groups) {
      const above = each.group.parent === id ? undefined : this.groups.get(each.group.parent);
      (above ?? this.top).below.push(each);
    }
  }

  // A machine is its group, and all that is below it.
  addMachine(machine) {
    const group = this.groups.get(machine.id);
    if (group === undefined) this.top.things.push(machine);
    else group.machine = machine;
  }

  addProcess(process) {
    const group = this.groups.get(process.id) ?? this.groups.get(process.parent) ?? this.top;
    group.things.push(process);
  }

  // The parts that a group consists of.
  partsOf(each, depth) {
    if (each.machine !== undefined) return [each.machine];
    const parts = [...each.things];
    for (const below of each.below) {
      const inside = this.partsOf(below, depth + 1);
      if (depth < DEEPEST) parts.push(...this.grouped(below.group, bySize(inside)));
      else parts.push(...inside);
    }
    return bySize(parts);
  }

  // A group of one thing is that thing.
  grouped(group, parts) {
    if (parts.length <= 1) return parts;
    const whole = part(group.name, 'groups', sumOf(parts), 'the sum of what is in it', parts);
    whole.told = group;
    return [whole];
  }

  parts() {
    const parts = this.partsOf(this.top, 0);
    // The group of all groups says nothing.
    return parts.length === 1 && parts[0].children.length > 0 ? parts[0].children : parts;
  }
}

function clientsOf(data, moment, roles) {
  const [machines, groups, processes] = ['machines', 'groups', 'processes'].map((key) =>
    thingsOf(data, moment, roles.things.find((role) => role.key === key)));
  const tree = new Groups(groups.all);
  for (const machine of machines.all) tree.addMachine(machine);
  for (const process of processes.all) tree.addProcess(process);
  return {parts: tree.parts(), unknown: machines.unknown + processes.unknown};
}

function takenAtStart(host, row, roles, total, managed) {
  const whole = part('Taken at start', 'start', total - managed,
    `${roles.report} ${roles.total} − ${roles.managed}`);
  for (const role of roles.startParts) {
    const bytes = host.bytes(row, role.column);
    if (bytes > 0) whole.children.push(part(role.title, role.key, bytes, `${roles.report} ${role.column}`));
  }
  return settle(whole, 'Other');
}

function managedPart(data, moment, roles, role, bytes) {
  const whole = part(role.title, role.key, bytes, `${roles.report} ${role.column}`);
  let unknown = 0;
  if (role.key === 'kernel') {
    const heaps = thingsOf(data, moment, roles.things.find((each) => each.key === 'heaps'));
    whole.children = bySize(heaps.all);
    unknown = heaps.unknown;
    settle(whole, 'Outside of heaps');
  } else if (role.key === 'clients') {
    const clients = clientsOf(data, moment, roles);
    whole.children = clients.parts;
    unknown = clients.unknown;
    settle(whole, 'Not told apart');
  }
  if (unknown > 0) whole.note = `${unknown} in it have no figure`;
  return whole;
}

// The tree of the host at a moment; null if its memory is not told.
export function balanceOf(data, moment) {
  const roles = data.head.roles;
  const host = new Rows(data, moment, roles.report);
  const row = host.rows[0];
  const total = row === undefined ? null : host.bytes(row, roles.total);
  if (total === null || total === 0) return null;
  const managed = host.bytes(row, roles.managed);
  const whole = part(shownText(data.head.host), 'host', total, `${roles.report} ${roles.total}`);
  for (const role of roles.parts) {
    const bytes = host.bytes(row, role.column);
    if (bytes > 0) whole.children.push(managedPart(data, moment, roles, role, bytes));
  }
  if (managed !== null && managed < total) {
    whole.children.push(takenAtStart(host, row, roles, total, managed));
  }
  return settle(whole, 'Not told apart');
}

// The parts of the balance at one row of the host's report, from the bottom of the stack up:
// [{key, title, bytes}], whose sum is the total; null if that is not told.
export function stackOf(host, row, roles) {
  const total = host.bytes(row, roles.total);
  if (total === null) return null;
  const managed = host.bytes(row, roles.managed) ?? total;
  const told = roles.parts.map((role) => ({...role, bytes: host.bytes(row, role.column) ?? 0}));
  const start = Math.max(0, total - managed);
  const rest = Math.max(0, total - start - sumOf(told));
  return [
    {key: 'start', title: 'Taken at start', bytes: start},
    {key: 'rest', title: 'Not told apart', bytes: rest},
    ...told,
  ];
}
