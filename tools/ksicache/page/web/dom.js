// Elements of the page. Whatever a capture says becomes text, never markup.

const SVG = 'http://www.w3.org/2000/svg';

function fill(element, attributes, children) {
  for (const [name, value] of Object.entries(attributes)) {
    if (name.startsWith('on')) {
      element.addEventListener(name.slice(2), value);
    } else if (value === true) {
      element.setAttribute(name, '');
    } else if (value !== false && value !== null && value !== undefined) {
      element.setAttribute(name, value);
    }
  }
  element.append(...children.filter((child) => child !== null));
  return element;
}

export function element(tag, attributes = {}, ...children) {
  return fill(document.createElement(tag), attributes, children);
}

export function svg(tag, attributes = {}, ...children) {
  return fill(document.createElementNS(SVG, tag), attributes, children);
}

// A name among other words, whose direction it leaves alone.
export function nameView(name) {
  return element('bdi', {}, name);
}

// Pieces of text with something between them.
export function joined(pieces, between) {
  return pieces.flatMap((each, i) => (i === 0 ? [each] : [between, each]));
}

const LONG = 160; // characters

// A text of which no more than some lines are shown until it is looked at.
export function clamped(tag, text) {
  const isLong = text.length > LONG;
  return element(tag, isLong ? {class: 'clamped', title: text, tabindex: 0} : {}, text);
}

// A list to choose from: `options` are [value, text].
export function choice(label, options, value, onchange) {
  const select = element('select', {onchange: () => onchange(select.value)},
    ...options.map(([each, text]) => element('option', {value: each, selected: each === value}, text)));
  return element('label', {}, `${label} `, select);
}
