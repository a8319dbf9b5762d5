// Who has the host's memory at a moment, out of the rows that tools/ksicache/page/memory_rows.cc
// puts.

const COLUMNS = ['part', 'identity', 'path', 'name', 'number', 'bytes'];

// {host, parts}: figures of the host by their names; of each of `parts`, by its name, the things
// {id, identity, path, name, number, bytes} in it and whether it is whole: of what is missing from
// one that is not, nothing is known.
export function memoryOf(rows, parts) {
  const memory = {host: {}, parts: Object.fromEntries(parts.map((part) => [part.name, {things: [], isWhole: true}]))};
  for (const row of rows) {
    const thing = {id: row.id};
    COLUMNS.forEach((name, place) => { thing[name] = row.values[place]; });
    if (thing.part < parts.length) memory.parts[parts[thing.part].name].things.push(thing);
    else if (thing.part === parts.length) memory.host[thing.name] = thing.bytes;
    else memory.parts[thing.name].isWhole = false;
  }
  return memory;
}

// The moment with the least free memory; null if that is known of none.
export function leastFree({memory}) {
  let least = null;
  memory.forEach(({host}, moment) => {
    if (host.free !== null && host.free !== undefined && (least === null || host.free < memory[least].host.free)) least = moment;
  });
  return least;
}
