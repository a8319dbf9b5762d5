// Where the memory is: the parts of the host at the chosen moment, each as large as its memory.
import {balanceOf} from './balance.js';
import {element, joined, nameView} from './dom.js';
import {memoryText, percentText, shortText} from './format.js';

const HEAD = 19; // the height of the name of a part that has others in it
const LEVELS = 3; // that are drawn below the one that is looked into
const SMALLEST = 3; // of a side; what is smaller cannot be seen
const SAID = 3; // parts that a note tells of
// Tiles that are wide enough for a name, and for a figure with it.
const OPEN = 60; // to show what is in them
const NAMED = 44;
const SIZED = 58;

function squarified(part, width, height) {
  const root = d3.hierarchy(part, (each) => each.children);
  root.eachBefore((node) => {
    node.scale = node.parent === null ? 1 : node.parent.scale * node.parent.data.share;
  });
  // What is in a part adds up to it, and so only what has nothing in it has a size of its own.
  root.eachAfter((node) => {
    node.value = node.children === undefined
      ? node.data.bytes * node.scale : d3.sum(node.children, (child) => child.value);
  });
  return d3.treemap().size([width, height])
    .paddingOuter((node) => (node.depth === 0 ? 0 : 1))
    .paddingTop((node) => (node.depth === 0 ? 0 : HEAD))(root);
}

// What is in a part and more than it.
function sumWords({data: {name, bytes, share}}) {
  return element('span', {}, 'what is in ', nameView(shortText(name)),
    ` adds up to ${memoryText(bytes / share)} and is drawn at ${percentText(share, 1)} of its size, as ${memoryText(bytes)}`);
}

// Why, of the parts that are drawn with what is in them, some are smaller than that.
function sharedWords(tree, opened) {
  const parts = tree.descendants().filter((node) => opened.has(node) && node.data.share < 1)
    .sort((a, b) => b.data.bytes - a.data.bytes);
  if (parts.length === 0) return [];
  const more = parts.length > SAID ? `; and so in ${parts.length - SAID} more` : '';
  return ['Some memory is counted with several: ', ...joined(parts.slice(0, SAID).map(sumWords), '; '), `${more}.`];
}

// Whether parts, of two moments perhaps, are one.
function isSame(a, b) {
  return a.id === b.id && a.name === b.name && a.key === b.key;
}

export class Treemap {
  constructor(data, state) {
    this.data = data;
    this.state = state;
    this.path = [];
    this.box = element('div', {class: 'treemap', role: 'group', 'aria-label': 'Parts of the memory', onkeydown: (event) => this.key(event)});
    this.crumbs = element('nav', {class: 'crumbs', 'aria-label': 'Part that is shown'});
    this.shared = element('p', {class: 'note'});
    this.detail = element('p', {class: 'detail', id: 'part-detail'});
    this.view = element('section', {class: 'where', 'aria-labelledby': 'where'},
      element('h2', {id: 'where'}, 'Where the memory is'), this.crumbs, this.box, this.shared, this.detail);
    state.watch(['at'], () => this.show());
    new ResizeObserver(() => this.draw()).observe(this.box);
  }

  // The parts from the host down to the one that is looked into, which at another moment is another
  // one of its number and name, or after a restart of its name.
  chain() {
    const chain = [this.root];
    for (const {id, name} of this.path) {
      const namesakes = chain.at(-1).children.filter((child) => child.name === name && child.children.length > 0);
      const next = namesakes.find((child) => child.id === id) ?? namesakes[0];
      if (next === undefined) break;
      chain.push(next);
    }
    return chain;
  }

  show() {
    this.root = balanceOf(this.data, this.state.get('at'));
    this.draw();
  }

  // The tile of a part, which at another moment, or in another size, is another one.
  tileOf(part) {
    return this.tiles.find((tile) => isSame(this.nodes.get(tile).data, part));
  }

  // Draws anew; the focus stays on the part that has it.
  draw() {
    const focused = this.nodes?.get(document.activeElement)?.data;
    this.drawTiles();
    if (focused !== undefined) (this.tileOf(focused) ?? this.tiles[0])?.focus({preventScroll: true});
  }

  drawTiles() {
    if (this.root === undefined) return;
    this.tiles = [];
    this.nodes = new Map();
    this.box.replaceChildren();
    this.box.hidden = this.root === null;
    if (this.root === null) {
      this.crumbs.replaceChildren();
      this.shared.replaceChildren();
      this.detail.textContent = 'How the memory divides could not be read at this moment.';
      return;
    }
    const chain = this.chain();
    this.drawCrumbs(chain);
    const {clientWidth: width, clientHeight: height} = this.box;
    if (width === 0) return;
    this.tree = squarified(chain.at(-1), width, height);
    this.opened = new Set([this.tree]); // whose parts are drawn, too
    this.tree.each((node) => this.drawTile(node));
    if (this.tiles.length > 0) this.tiles[0].tabIndex = 0;
    this.shared.replaceChildren(...sharedWords(this.tree, this.opened));
    this.describe(chain.at(-1), chain);
  }

  drawCrumbs(chain) {
    const links = chain.map((part, depth) => {
      const isLast = depth === chain.length - 1;
      const words = [nameView(shortText(part.name)), ` ${memoryText(part.bytes)}`];
      return element('li', {}, isLast ? element('span', {'aria-current': 'true'}, ...words)
        : element('button', {type: 'button', onclick: () => this.lookInto(this.path.slice(0, depth), chain[depth + 1])}, ...words));
    });
    this.crumbs.replaceChildren(element('ol', {}, ...links));
  }

  drawTile(node) {
    const width = node.x1 - node.x0;
    const height = node.y1 - node.y0;
    const isInside = node.depth > 0 && this.opened.has(node.parent);
    if (!isInside || width < SMALLEST || height < SMALLEST) return;
    const {data: part} = node;
    const isOpen = part.children.length > 0 && node.depth < LEVELS && height > HEAD + 4 && width > OPEN;
    if (isOpen) this.opened.add(node);
    const tile = element('button', {
      type: 'button', class: `tile ${part.key}${isOpen ? ' open' : ''}`, tabindex: -1,
      'aria-label': `${shortText(part.name)} ${memoryText(part.bytes)}`, 'aria-describedby': 'part-detail',
      onclick: () => this.open(node),
      onfocus: () => this.focus(tile, part, node),
      onpointerenter: () => this.describe(part, this.partsTo(node)),
    });
    const isTall = !isOpen && width <= SIZED && height > 3 * width;
    if (isTall && width >= 15 && height > SIZED) {
      tile.classList.add('tall');
      tile.append(element('span', {class: 'name'}, nameView(part.name), ` ${memoryText(part.bytes)}`));
    } else if (width > NAMED && height > 13) {
      tile.append(element('span', {class: 'name', dir: 'auto'}, part.name), ' ');
      if (width > SIZED && (height > 32 || isOpen)) tile.append(element('span', {class: 'size'}, memoryText(part.bytes)));
    } else {
      tile.classList.add('bare');
    }
    // Of the whole, so that paper of another width shows it, too.
    const {x1, y1} = this.tree;
    const percent = (length, whole) => `${100 * length / whole}%`;
    Object.assign(tile.style, {
      left: percent(node.x0, x1), top: percent(node.y0, y1), width: percent(width, x1), height: percent(height, y1),
    });
    this.tiles.push(tile);
    this.nodes.set(tile, node);
    this.box.append(tile);
  }

  partsTo(node) {
    return [...this.chain().slice(0, -1), ...node.ancestors().reverse().map((each) => each.data)];
  }

  // Looks into the part, or, at the part, into the one that it is in.
  open(node) {
    const hasParts = node.data.children.length > 0;
    const inside = (hasParts ? node : node.parent).ancestors().reverse().slice(1).map(({data: {id, name}}) => ({id, name}));
    if (inside.length > 0) this.lookInto([...this.path, ...inside], hasParts ? null : node.data);
  }

  // `part`: what has the focus then; the first of all if it is null, or is not there.
  lookInto(path, part) {
    this.path = path;
    this.drawTiles();
    ((part && this.tileOf(part)) ?? this.tiles[0])?.focus();
  }

  focus(tile, part, node) {
    for (const each of this.tiles) each.tabIndex = each === tile ? 0 : -1;
    this.describe(part, this.partsTo(node));
  }

  // The figure, its share of the host and where it comes from.
  describe(part, chain) {
    const words = [`${memoryText(part.bytes)}, ${percentText(part.bytes, this.root.bytes)} of the host`, part.source];
    if (part.share < 1) {
      words.push(`what is in it adds up to ${memoryText(part.bytes / part.share)}, as some memory is counted with several, and is drawn at ${percentText(part.share, 1)} of its size`);
    }
    if (part.note !== '') words.push(part.note);
    const names = chain.length > 1 ? chain.slice(1) : [part];
    this.detail.replaceChildren(
      element('strong', {}, ...joined(names.map(({name}) => nameView(shortText(name))), ' › ')), ` ${words.join(' · ')}`);
  }

  key(event) {
    if (event.key === 'Escape' || event.key === 'Backspace') {
      const chain = this.chain();
      const depth = chain.length - 1;
      if (depth > 0) this.lookInto(this.path.slice(0, depth - 1), chain[depth]);
    } else if (event.key === 'Home' || event.key === 'End') {
      this.tiles.at(event.key === 'Home' ? 0 : -1)?.focus();
    } else if (event.key.startsWith('Arrow')) {
      this.neighbour(event.target, event.key)?.focus();
    } else {
      return;
    }
    event.preventDefault();
  }

  // The nearest tile in the direction of an arrow.
  neighbour(tile, key) {
    const from = this.nodes.get(tile);
    if (from === undefined) return null;
    const [dx, dy] = {ArrowLeft: [-1, 0], ArrowRight: [1, 0], ArrowUp: [0, -1], ArrowDown: [0, 1]}[key];
    let best = null;
    let least = Infinity;
    for (const [each, {x0, y0}] of this.nodes) {
      const ahead = dx * (x0 - from.x0) + dy * (y0 - from.y0);
      const aside = Math.abs(dy * (x0 - from.x0)) + Math.abs(dx * (y0 - from.y0));
      if (ahead > 0 && ahead + 3 * aside < least) {
        least = ahead + 3 * aside;
        best = each;
      }
    }
    return best;
  }
}
