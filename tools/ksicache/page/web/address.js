// The chosen moments in the page's address: a reload shows them again, and so does a link that
// somebody is sent.
import {isoText} from './times.js';

const WAIT = 300; // ms: a browser lets an address change so often and no more
const NAMES = ['at', 'from'];

// What moments are called: by their times, and those of one second by their place among them, too.
function namesOf({taken}) {
  const counts = new Map();
  return taken.map((time) => {
    const text = isoText(time);
    const count = (counts.get(text) ?? 0) + 1;
    counts.set(text, count);
    return count === 1 ? text : `${text},${count}`;
  });
}

// Those that the address has, of {at, from}: "#at=2026-11-21T15:00:00Z&from=2026-11-21T13:00:00Z"
export function addressed({head}) {
  const words = new URLSearchParams(location.hash.slice(1));
  const names = namesOf(head.full);
  const moments = {};
  for (const name of NAMES) {
    const place = names.indexOf(words.get(name));
    if (place >= 0) moments[name] = place;
  }
  return moments;
}

export function keepAddress(data, state) {
  const names = namesOf(data.head.full);
  let timer = null;
  const put = () => {
    const words = NAMES.map((name) => `${name}=${names[state.get(name)]}`);
    history.replaceState(null, '', `#${words.join('&')}`);
  };
  state.watch(NAMES, () => {
    clearTimeout(timer);
    timer = setTimeout(put, WAIT);
  });
  addEventListener('hashchange', () => state.set(addressed(data)));
}
