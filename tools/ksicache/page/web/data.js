// Unpacks what the page carries.
import {Bytes} from './bytes.js';

async function unpack(id) {
  const text = atob(document.getElementById(id).textContent.trim());
  const packed = Uint8Array.from(text, (c) => c.charCodeAt(0));
  const stream = new Blob([packed]).stream().pipeThrough(new DecompressionStream('deflate'));
  return new Uint8Array(await new Response(stream).arrayBuffer());
}

// What the page's scripts read first, and the packed rows and lines.
export async function load() {
  const [head, points, tables, lines] = await Promise.all(
    ['head', 'points', 'tables', 'lines'].map(unpack));
  return {
    head: JSON.parse(new TextDecoder().decode(head)),
    points: new Bytes(points),
    tables: new Bytes(tables),
    lines: new Bytes(lines),
  };
}

// Whether this browser can.
export function canLoad() {
  return typeof DecompressionStream === 'function';
}
