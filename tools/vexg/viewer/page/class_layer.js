// A map of classes over the scene, and its legend.
import {el, panel, tick} from './dom.js';
import {PixelTiles} from './pixel_tiles.js';
import {colorsOf, paintPalette} from './stretch.js';
import {texts} from './texts.js';

/** Colours for a map that brings none, far apart from each other: by the golden angle. */
function legendOf(raster) {
  if (raster.legend) return raster.legend;
  const count = raster.type === 'Byte' ? 256 : 4096;
  return Array.from({length: count}, (_, value) => {
    const hue = (value * 137.508) % 360, part = (n) => {
      const k = (n + hue / 30) % 12;
      return Math.round(255 * (0.55 - 0.35 * Math.max(-1, Math.min(k - 3, 9 - k, 1))));
    };
    return {value, name: '', color: value === 0 ? [0, 0, 0, 0] : [part(0), part(8), part(4), 255]};
  });
}

export class ClassLayer {
  constructor(number, raster, map, onFault) {
    this.map = map;
    this.number = number;
    this.raster = raster;
    this.legend = legendOf(raster);
    // Where classes have names, a value without one is none.
    const hasNames = this.legend.some(({name}) => name !== '');
    this.hidden = new Set(hasNames ? this.legend.filter(({name}) => name === '').map(({value}) => value) : []);
    this.colors = colorsOf(this.legend, this.hidden);
    this.tiles = new PixelTiles(number, raster, {
      bands: () => [0], onFault,
      paint: (tile, rgba, width, height) => paintPalette(tile, rgba, width, height, 0, this.colors),
    });
    this.layer.setOpacity(0.6);
  }

  get layer() { return this.tiles.layer; }

  refresh() {
    this.colors = colorsOf(this.legend, this.hidden);
    this.tiles.repaint(this.map);
  }

  /** The name of a value, for the reading at the cursor. */
  nameOf(value) { return this.legend[Number(value)]?.name ?? ''; }
}

/**
 * The legend: a box for each class that has a name, or a colour where none has one.
 * @param layer {legend, hidden, refresh}
 */
export function legendPanel(layer) {
  const named = layer.legend.filter(({name}) => name !== '');
  const shown = named.length ? named : layer.legend.filter(({color}) => color[3] !== 0).slice(0, 64);
  const boxes = shown.map((row) => {
    const box = tick(row.name || texts.noName(row.value), true, (isOn) => {
      if (isOn) layer.hidden.delete(row.value); else layer.hidden.add(row.value);
      layer.refresh();
    });
    const swatch = el('span', {class: 'swatch', 'aria-hidden': 'true'});
    swatch.style.backgroundColor = `rgba(${row.color.slice(0, 3)},${row.color[3] / 255})`;
    box.row.insertBefore(swatch, box.row.lastChild);
    return {...box, value: row.value};
  });
  const all = (isOn) => () => {
    for (const box of boxes) {
      box.input.checked = isOn;
      if (isOn) layer.hidden.delete(box.value); else layer.hidden.add(box.value);
    }
    layer.refresh();
  };
  return panel(texts.classes, el('div', {class: 'legend'}, ...boxes.map((box) => box.row)),
    el('div', {class: 'row'}, el('button', {type: 'button', onclick: all(true)}, texts.allClasses),
      el('button', {type: 'button', onclick: all(false)}, texts.noClasses)));
}
