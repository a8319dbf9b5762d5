// How the memory of a host divides at one moment: a tree of parts whose sizes add up.
//
// A part is {name, id, key, bytes, source, children, share, note}: `id` is the kernel's number of its
// group, if it has one, `key` the style that it has, `source` says which report and columns it comes
// from, `share` by how much its children are drawn smaller than they are because together they would
// be larger than it.
import {bytesOf, memoryText, shownText} from './format.js';

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
  return {name, id: null, key, bytes, source, children, share: 1, note: ''};
}

function sumOf(parts) {
  return parts.reduce((sum, each) => sum + each.bytes, 0);
}

function bySize(parts) {
  return parts.filter((each) => each.bytes > 0).sort((a, b) => b.bytes - a.bytes);
}

// Makes the children of a part as large as it is: what they leave has a name, and where they are
// more, because some memory is counted with several of them, they share it.
function settle(whole, restName) {
  if (whole.children.length === 0) return whole;
  const sum = sumOf(whole.children);
  if (sum < whole.bytes) {
    const rest = part(restName, 'rest', whole.bytes - sum, `${whole.source} less all that is told apart`);
    whole.children.push(rest);
    // It may be too small to be seen.
    whole.note = [whole.note, `${memoryText(rest.bytes)} of it: ${restName.toLowerCase()}`].filter((note) => note !== '').join(' · ');
  } else if (sum > whole.bytes) {
    whole.share = whole.bytes / sum;
  }
  return whole;
}

// The things of one kind, each with what it has of another kind in it: of machines their overhead,
// of user worlds their page tables. `unknown` counts those without a figure.
class Things {
  constructor(data, moment, key, kind, beside) {
    const info = (name) => data.head.parts.find((each) => each.name === name);
    this.info = info(kind);
    this.besideInfo = beside === undefined ? null : info(beside);
    this.key = key;
    this.unknown = 0;
    this.all = [];
    const {parts} = data.memory[moment];
    this.beside = new Map((parts[beside]?.things ?? []).map((thing) => [String(thing.number), thing.bytes]));
    for (const thing of parts[kind]?.things ?? []) this.add(thing);
  }

  add(thing) {
    if (thing.bytes === null) {
      ++this.unknown;
      return;
    }
    const id = String(thing.number);
    const more = Number(this.beside.get(id) ?? 0);
    this.beside.delete(id); // once, should two have one number
    const source = this.besideInfo === null ? this.info.source : `${this.info.source} + ${this.besideInfo.source}`;
    const made = part(shownText(thing.name), this.key, Number(thing.bytes) + more, source);
    made.id = id;
    if (more > 0) made.note = `${memoryText(more)} of it ${this.besideInfo.name}`;
    this.all.push(made);
  }
}

// Machines and processes in the tree of groups.
class Groups {
  constructor(data, moment) {
    const role = data.head.roles.groups;
    const rows = new Rows(data, moment, role.report);
    const told = new Map(data.memory[moment].parts.groups.things.map((thing) => [String(thing.number), thing]));
    this.told = told;
    this.source = data.head.parts.find((each) => each.name === 'groups').source;
    this.groups = new Map(rows.rows.map((row) => [String(rows.value(row, role.id)), {
      name: shownText(told.get(String(rows.value(row, role.id)))?.name ?? rows.value(row, role.name) ?? ''), parent: String(rows.value(row, role.parent)), below: [], things: [],
    }]));
    this.top = {below: [], things: []};
    for (const [id, each] of this.groups) {
      each.id = id;
      this.above(each).below.push(each);
    }
    this.openRings();
  }

  above(group) {
    return this.groups.get(group.parent) ?? this.top;
  }

  // Groups that are in one another have their place at the top, so that none is left out.
  openRings() {
    const reached = new Set();
    const reach = (group) => {
      const due = [group];
      while (due.length > 0) {
        const each = due.pop();
        if (reached.has(each)) continue;
        reached.add(each);
        due.push(...each.below);
      }
    };
    reach(this.top);
    for (const group of this.groups.values()) {
      if (reached.has(group)) continue;
      const {below} = this.above(group);
      below.splice(below.indexOf(group), 1);
      this.top.below.push(group);
      reach(group);
    }
  }

  // What is in the group of its number, or is that group.
  add(thing) {
    (this.groups.get(thing.id) ?? this.top).things.push(thing);
  }

  // The parts that a group consists of.
  partsOf(each, depth) {
    const parts = [...each.things];
    for (const below of each.below) {
      const inside = this.partsOf(below, depth + 1);
      if (depth < DEEPEST) parts.push(...this.grouped(below, inside));
      else parts.push(...inside);
    }
    return bySize(parts);
  }

  // A group of one thing is that thing.
  grouped(group, parts) {
    if (parts.length <= 1) return parts;
    const whole = part(group.name, 'groups', sumOf(parts), 'the sum of what is in it', parts);
    whole.id = group.id;
    const own = this.told.get(group.id)?.bytes ?? null;
    if (own !== null) whole.note = `the group itself has ${memoryText(Number(own))} (${this.source})`;
    return [whole];
  }

  parts() {
    const parts = this.partsOf(this.top, 0);
    // The group of all groups says nothing.
    return parts.length === 1 && parts[0].children.length > 0 ? parts[0].children : parts;
  }
}

function clientsOf(data, moment) {
  const machines = new Things(data, moment, 'machines', 'machines', 'overheads of machines');
  const worlds = new Things(data, moment, 'processes', 'user worlds', 'page tables');
  const tree = new Groups(data, moment);
  for (const thing of [...machines.all, ...worlds.all]) tree.add(thing);
  return {children: tree.parts(), unknown: machines.unknown + worlds.unknown, rest: data.head.roles.rest};
}

function heapsOf(data, moment) {
  const heaps = new Things(data, moment, 'heaps', 'heaps');
  return {children: bySize(heaps.all), unknown: heaps.unknown, rest: 'Outside of heaps'};
}

// What is inside of a part of the host.
const INSIDE = {kernel: heapsOf, clients: clientsOf};

function managedPart(data, moment, role, bytes) {
  const whole = part(role.title, role.key, bytes, `${data.head.roles.report} ${role.column}`);
  const inside = INSIDE[role.key]?.(data, moment);
  if (inside === undefined) return whole;
  whole.children = inside.children;
  if (inside.unknown > 0) whole.note = `${inside.unknown} in it have no figure`;
  return settle(whole, inside.rest);
}

function takenAtStart(host, row, roles, total, managed) {
  const whole = part(roles.start, 'start', total - managed,
    `${roles.report} ${roles.total} − ${roles.managed}`);
  for (const role of roles.startParts) {
    const bytes = host.bytes(row, role.column);
    if (bytes > 0) whole.children.push(part(role.title, role.key, bytes, `${roles.report} ${role.column}`));
  }
  return settle(whole, 'Other');
}

// The tree of the host at a moment; null if its memory is not told.
export function balanceOf(data, moment) {
  const {roles} = data.head;
  const host = new Rows(data, moment, roles.report);
  const row = host.rows[0];
  const total = row === undefined ? null : host.bytes(row, roles.total);
  if (total === null || total === 0) return null;
  const managed = host.bytes(row, roles.managed);
  const whole = part(shownText(data.head.host), 'host', total, `${roles.report} ${roles.total}`);
  for (const role of roles.parts) {
    const bytes = host.bytes(row, role.column);
    if (bytes > 0) whole.children.push(managedPart(data, moment, role, bytes));
  }
  if (managed !== null && managed < total) {
    whole.children.push(takenAtStart(host, row, roles, total, managed));
  }
  return settle(whole, roles.rest);
}

// What is free, of the parts of a balance; null if it has no figure.
export function freeOf(stack) {
  return stack.find((part) => part.key === 'free').bytes;
}

// The parts of the balance at one row of the host's report, from the bottom of the stack up:
// [{key, title, bytes}], whose sum is the total; null if that is not told. What has no figure is in
// the rest; but if it is what is free, the rest has none.
export function stackOf(host, row, roles) {
  const total = host.bytes(row, roles.total);
  if (total === null) return null;
  const managed = host.bytes(row, roles.managed) ?? total;
  const told = roles.parts.map((role) => ({...role, bytes: host.bytes(row, role.column)}));
  const start = Math.max(0, total - managed);
  const rest = freeOf(told) === null ? null : Math.max(0, total - start - sumOf(told));
  return [
    {key: 'start', title: roles.start, bytes: start},
    {key: 'rest', title: roles.rest, bytes: rest},
    ...told,
  ];
}
