// The tool bar and the keys.
import {card, closeLastCard, tableOf} from './cards.js';
import {el} from './dom.js';
import {texts} from './texts.js';

// Strokes of the signs, in a square of 24.
const kSigns = {
  fit: 'M4 9V4h5M15 4h5v5M20 15v5h-5M9 20H4v-5',
  actual: 'M5 5h6v6H5zM13 13h6v6h-6zM13 5h6v6h-6zM5 13h6v6H5z',
  region: 'M5 8l8-4 7 6-3 9-9 1z',
  viewRegion: 'M4 6h16v12H4zM8 10h8v4H8z',
  swipe: 'M4 5h16v14H4zM12 5v14M15 9l2 3-2 3M9 9l-2 3 2 3',
  overview: 'M4 4h16v16H4zM4 13h7v7',
  picture: 'M12 4v11M7 11l5 5 5-5M5 20h14',
  print: 'M7 8V4h10v4M7 16H4V8h16v8h-3M7 13h10v7H7z',
  dark: 'M20 14a8 8 0 1 1-9-10 6 6 0 0 0 9 10z',
  help: 'M9 9a3 3 0 1 1 4.5 2.6c-1 .6-1.5 1.2-1.5 2.4M12 18v.01',
};

function signOf(name) {
  const made = (tag, attributes) => {
    const part = document.createElementNS('http://www.w3.org/2000/svg', tag);
    for (const [key, value] of Object.entries(attributes)) part.setAttribute(key, value);
    return part;
  };
  const svg = made('svg', {viewBox: '0 0 24 24', class: 'sign', 'aria-hidden': 'true'});
  svg.append(made('path', {d: kSigns[name]}));
  return svg;
}

/**
 * @param tools {name, key, run, isToggle}; run gives whether a toggle is on.
 */
export function makeTools(tools, onEscape) {
  const bar = document.getElementById('tools');
  bar.setAttribute('aria-label', texts.tools);
  const byKey = new Map();
  for (const tool of tools) {
    const button = el('button', {type: 'button', title: `${texts[tool.name]} (${tool.key.toUpperCase()})`, 'data-tool': tool.name});
    button.append(signOf(tool.name), el('span', {class: 'word'}, texts[tool.name]));
    if (tool.isToggle) button.setAttribute('aria-pressed', 'false');
    const run = () => {
      const isOn = tool.run();
      if (tool.isToggle) button.setAttribute('aria-pressed', String(Boolean(isOn)));
    };
    tool.off = () => button.setAttribute('aria-pressed', 'false');
    button.addEventListener('click', run);
    byKey.set(tool.key, run);
    bar.append(button);
  }
  document.addEventListener('keydown', (event) => {
    if (event.ctrlKey || event.metaKey || event.altKey) return;
    if (event.key === 'Escape') { if (!onEscape()) closeLastCard(); return; }
    if (event.target.closest('input:not([type=checkbox]):not([type=range]), select')) return;
    byKey.get(event.key.toLowerCase())?.();
  });
}

/** Shows the keys. */
export function showHelp() {
  card('help', texts.help).fill(tableOf(['', ''], texts.keys));
}

/** Changes between dark and light, beginning with what the system wants. */
export function toggleDark() {
  const root = document.documentElement;
  const isDark = root.dataset.theme ? root.dataset.theme === 'dark' : matchMedia('(prefers-color-scheme: dark)').matches;
  root.dataset.theme = isDark ? 'light' : 'dark';
}
