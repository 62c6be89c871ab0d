// The map as a picture, for a file and for paper.
import {el} from './dom.js';
import {texts} from './texts.js';

const kFiner = 2;  // pixels of a picture for one of the screen

/** What the map shows now, as a canvas. */
function drawLayers(map) {
  const [width, height] = map.getSize();
  const canvas = el('canvas', {width, height});
  const context = canvas.getContext('2d');
  for (const part of map.getViewport().querySelectorAll('.ol-layers .ol-layer canvas, .ol-layers canvas.ol-layer')) {
    if (part.width === 0) continue;
    context.globalAlpha = Number(part.parentNode.style.opacity || part.style.opacity || 1);
    const numbers = part.style.transform.match(/^matrix\(([^)]*)\)$/)?.[1].split(',').map(Number);
    context.setTransform(...(numbers ?? [1, 0, 0, 1, 0, 0]));
    context.drawImage(part, 0, 0);
  }
  return canvas;
}

/** A canvas of what the map shows, with twice the pixels of the screen each way. */
export async function makePicture(map) {
  const view = map.getView(), size = map.getSize(), resolution = view.getResolution(), center = view.getCenter();
  const target = map.getTargetElement();
  target.classList.add('finer');  // the viewport is larger than the page for a moment
  map.setSize(size.map((length) => length * kFiner));
  view.setResolution(resolution / kFiner);
  try {
    return await new Promise((resolve) => {
      map.once('rendercomplete', () => resolve(drawLayers(map)));
      map.render();
    });
  } finally {
    map.setSize(size);
    view.setResolution(resolution);
    view.setCenter(center);
    target.classList.remove('finer');
  }
}

/** What stands on paper: the map with its title, its scale and the legends of what it shows. */
export class PrintSheet {
  /**
   * @param title of the page.
   * @param legends () => [{name, rows: [{name, color}]}].
   */
  constructor(map, title, legends) {
    this.map = map;
    this.title = title;
    this.legends = legends;
    this.root = document.getElementById('sheet');
    this.root.setAttribute('aria-label', texts.sheet);
    // Printed by the browser itself there is no time for more than what the screen shows.
    window.addEventListener('beforeprint', () => { if (!this.isMade) this.fill(drawLayers(map)); });
    window.addEventListener('afterprint', () => { this.isMade = false; });
  }

  /** The scale bar of the screen: its text, and its share of the map's width. */
  getScale() {
    const line = document.getElementById('scale-line');
    return [document.getElementById('scale-text').textContent, parseFloat(line.style.width || '0') / this.map.getSize()[0]];
  }

  fill(canvas, [text, share] = this.getScale()) {
    const bar = el('span', {class: 'sheet-line'});
    bar.style.width = `${100 * share}%`;
    const legends = this.legends().map(({name, rows}) => el('div', {class: 'sheet-legend'}, el('h2', {}, name),
      ...rows.map((row) => {
        const swatch = el('span', {class: 'swatch'});
        swatch.style.backgroundColor = `rgba(${row.color.slice(0, 3)},${row.color[3] / 255})`;
        return el('p', {}, swatch, row.name);
      })));
    this.root.replaceChildren(el('h1', {}, this.title), canvas,
      el('div', {class: 'sheet-scale'}, text, bar), ...legends);
  }

  async print() {
    const scale = this.getScale();
    this.fill(await makePicture(this.map), scale);
    this.isMade = true;
    window.print();
  }
}
