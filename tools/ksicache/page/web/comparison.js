// How a host's memory went from one moment to another, and who explains it: what `ksicache diff`
// computes in tools/ksicache/diff/balance.cc, to the last digit.

// What 64 bits do not hold has no value.
function held(number) {
  return BigInt.asIntN(64, number) === number ? number : null;
}

function less(a, b) {
  return a === null || b === null ? null : held(a - b);
}

function sum(a, b) {
  return a === null || b === null ? null : held(a + b);
}

function exact(number) {
  return number === null || number === undefined ? null : BigInt(number);
}

function growthOf(before, after) {
  return {before, after, growth: less(after, before)};
}

function grouped(things, keyOf) {
  const groups = new Map();
  for (const thing of things) {
    const key = keyOf(thing);
    const group = groups.get(key);
    if (group === undefined) groups.set(key, [thing]);
    else group.push(thing);
  }
  return groups;
}

// Pairs of things [before, after] that are one by what `keyOf` says, those of the moment after in
// their order, then those that have gone. Where several are called the same, they are taken in
// their order if `mayRepeat`; else none of them is the other.
function matched(before, after, keyOf, mayRepeat) {
  const earlier = grouped(before, keyOf);
  const later = mayRepeat ? null : grouped(after, keyOf);
  const used = new Map();
  const gone = new Set(before);
  const pairs = after.map((thing) => {
    const key = keyOf(thing);
    const found = earlier.get(key) ?? [];
    if (!mayRepeat && (found.length > 1 || later.get(key).length > 1)) return [null, thing];
    const place = used.get(key) ?? 0;
    if (place >= found.length) return [null, thing];
    used.set(key, place + 1);
    gone.delete(found[place]);
    return [found[place], thing];
  });
  return [...pairs, ...[...gone].map((thing) => [thing, null])];
}

// Orders those that changed most first, whichever way.
export function byGrowth(a, b) {
  const [first, second] = [a, b].map(({growth}) => (growth < 0n ? -growth : growth));
  return second > first ? 1 : second < first ? -1 : 0;
}

function stateOf([before, after]) {
  return before === null ? 'new' : after === null ? 'gone' : 'changed';
}

// What became of a part: {info, isKnown, count, unknown, before, after, growth, things}.
function partGrowth(info, before, after, shown, keyOf, mayRepeat) {
  const isTold = ({things, isWhole}) => isWhole || things.length > 0;
  const part = {info, isKnown: isTold(before) && isTold(after), count: 0, unknown: 0, ...growthOf(null, null), things: []};
  if (!part.isKnown) return part;
  part.count = after.things.length;
  // What a thing has that is not there: it may be missing.
  const ofNone = before.isWhole && after.isWhole ? 0n : null;
  let [was, is] = [0n, 0n];
  for (const pair of matched(before.things, after.things, keyOf, mayRepeat)) {
    const [from, to] = pair.map((thing) => (thing === null ? ofNone : exact(thing.bytes)));
    if (less(to, from) === null) {
      ++part.unknown;
      continue;
    }
    [was, is] = [sum(was, from), sum(is, to)];
    const growth = growthOf(shown(from), shown(to));
    if (growth.growth !== 0n) part.things.push({...pair[1] ?? pair[0], kind: info.name, state: stateOf(pair), ...growth});
  }
  Object.assign(part, growthOf(shown(was), shown(is)));
  part.things.sort(byGrowth);
  return part;
}

// Compares two moments' memory (memory.js), in units of 2^shift bytes. `hasSameNumbers`: the
// kernel's numbers name the same groups and processes in both.
export function compared(before, after, infos, shift, hasSameNumbers) {
  const unit = 1n << BigInt(shift);
  const shown = (bytes) => (bytes === null ? null : bytes / unit);
  const keyOf = hasSameNumbers ? (thing) => thing.identity : (thing) => thing.path ?? thing.identity;
  const figure = (name) => growthOf(shown(exact(before.host[name])), shown(exact(after.host[name])));
  const [total, free] = [figure('total'), figure('free')];
  const used = growthOf(less(total.before, free.before), less(total.after, free.after));
  const parts = infos.map((info) =>
    partGrowth(info, before.parts[info.name], after.parts[info.name], shown, keyOf, hasSameNumbers));
  const nobody = parts.filter((part) => part.info.isAdded && part.isKnown)
    .reduce((rest, part) => less(rest, part.growth), used.growth);
  return {
    host: {total, free, used, kernel: figure('kernel'), caches: figure('caches'), others: figure('others')},
    parts, nobody,
  };
}
