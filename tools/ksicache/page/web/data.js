// Unpacks what the page carries.
import {Bytes} from './bytes.js';

// The bytes of base64.
function bytesOf(base64) {
  const text = atob(base64);
  const bytes = new Uint8Array(text.length);
  for (let i = 0; i < text.length; ++i) bytes[i] = text.charCodeAt(i);
  return bytes;
}

async function unpack(id) {
  const packed = bytesOf(document.getElementById(id).textContent.trim());
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
