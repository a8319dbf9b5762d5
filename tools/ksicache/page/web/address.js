// The chosen moments in the page's address: a reload shows them again, and so does a link that
// somebody is sent.
import {isoText} from './times.js';

const WAIT = 300; // ms: a browser lets an address change so often and no more
const NAMES = ['at', 'from'];

// Those that the address has, of {at, from}: "#at=2026-11-21T15:00:00Z&from=2026-11-21T13:00:00Z"
export function addressed({head}) {
  const words = new URLSearchParams(location.hash.slice(1));
  const moments = {};
  for (const name of NAMES) {
    const place = head.full.taken.findIndex((time) => isoText(time) === words.get(name));
    if (place >= 0) moments[name] = place;
  }
  return moments;
}

export function keepAddress(data, state) {
  let timer = null;
  const put = () => {
    const words = NAMES.map((name) => `${name}=${isoText(data.head.full.taken[state.get(name)])}`);
    history.replaceState(null, '', `#${words.join('&')}`);
  };
  state.watch(NAMES, () => {
    clearTimeout(timer);
    timer = setTimeout(put, WAIT);
  });
  addEventListener('hashchange', () => state.set(addressed(data)));
}
