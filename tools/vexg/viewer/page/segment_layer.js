// Borders of segments, painted from tiles of labels: as quick for ten million segments as for ten.
import {card, tableOf} from './cards.js';
import {el, field, panel, shortNumber, tick} from './dom.js';
import {PixelTiles} from './pixel_tiles.js';
import {get} from './server.js';
import {texts} from './texts.js';

const kPixelsOfSegment = 300;  // on average, at the beginning
const kWaitMs = 200;  // after a move of the slider
const kLookMs = 300;  // between two looks at attributes that are computed

/** The values of bands as a table with a row for each band, and the others as a list. */
function attributeTables(attributes) {
  const columns = [], bands = [], others = [];
  for (const {name, value} of attributes) {
    const [, kind, band] = name.match(/^(.*)_b(\d+)$/) ?? [];
    if (band === undefined) { others.push([name, shortNumber(value)]); continue; }
    if (!columns.includes(kind)) columns.push(kind);
    bands[band] ??= [band];
    bands[band].push(shortNumber(value));
  }
  return [tableOf([texts.columns.band, ...columns], bands), tableOf([texts.attribute, texts.value], others)];
}

export class SegmentLayer {
  constructor(number, raster, map, onFault) {
    this.number = number;
    this.raster = raster;
    this.map = map;
    this.onFault = onFault;
    this.cost = 0;
    this.chosen = null;
    this.setColor('#ffe14d');
    this.tiles = new PixelTiles(number, raster, {
      bands: () => [0], edge: true, onFault,
      query: () => (this.cost > 0 ? `&cost=${this.cost}` : ''),
      paint: (tile, rgba, width, height) => this.paint(tile, rgba, width, height),
    });
  }

  get layer() { return this.tiles.layer; }

  setColor(text) {
    this.color = text;
    const value = parseInt(text.slice(1), 16);
    this.border = ((255 << 24) | ((value & 255) << 16) | (value & 0xff00) | (value >> 16)) >>> 0;
    this.fill = ((90 << 24) | (this.border & 0xffffff)) >>> 0;
  }

  /** A pixel is border where the label to its right or below it is another one. */
  paint(tile, rgba, width, height) {
    const {values, width: stride, height: lines} = tile;
    for (let y = 0; y < height; ++y) {
      const below = y + 1 < lines ? stride : 0;
      for (let x = 0; x < width; ++x) {
        const at = y * stride + x, label = values[at];
        const isBorder = (x + 1 < stride && values[at + 1] !== label) || values[at + below] !== label;
        if (isBorder) rgba[y * width + x] = this.border;
        else if (label === this.chosen) rgba[y * width + x] = this.fill;
      }
    }
  }

  /** Asks for the scales of a tree, and begins with segments that can be told apart. */
  async start() {
    if (!this.raster.isTree) return;
    this.scales = await get(`scales/${this.number}`);
    const wanted = (this.raster.samples * this.raster.lines) / kPixelsOfSegment;
    const at = this.scales.segments.findIndex((count) => count <= wanted);
    this.cost = this.scales.costs.at(at) ?? 0;
  }

  refresh() { this.tiles.repaint(this.map); }

  setCost(cost) {
    this.cost = cost;
    this.chosen = null;
    this.tiles.reload();
  }

  /** Shows the attributes of the segment at a pixel. */
  async choose(x, y) {
    if (!this.layer.getVisible() || x < 0 || y < 0 || x >= this.raster.samples || y >= this.raster.lines) return;
    const cost = this.cost;
    const shown = card('segment', texts.segmentTitle('…'), () => { this.chosen = null; this.refresh(); });
    try {
      for (;;) {
        const told = await get(`segment/${this.number}?x=${x}&y=${y}${cost > 0 ? `&cost=${cost}` : ''}`);
        if (!shown.isOpen() || cost !== this.cost) return;
        if (told.label === null) { shown.say(texts.segmentNone); return; }
        if (this.chosen !== told.label) {
          this.chosen = told.label;
          this.refresh();
          shown.setTitle(texts.segmentTitle(told.label));
        }
        if (told.attributes) {
          shown.fill(...attributeTables(told.attributes));
          return;
        }
        if (told.fault) { shown.say(told.fault); return; }
        shown.say(texts.computing(Math.round(100 * told.progress)));
        await new Promise((resolve) => setTimeout(resolve, kLookMs));
      }
    } catch (fault) {
      shown.say(fault.message);
      this.onFault(fault);
    }
  }

  makePanel() {
    const borders = tick(texts.borders, true, (isOn) => this.layer.setVisible(isOn));
    this.layer.on('change:visible', () => { borders.input.checked = this.layer.getVisible(); });
    const color = el('input', {type: 'color', value: this.color});
    color.addEventListener('input', () => { this.setColor(color.value); this.refresh(); });
    const rows = [borders.row, field(texts.borderColor, color)];
    if (this.raster.isTree) rows.push(this.makeSlider());
    return panel(texts.segments, ...rows);
  }

  makeSlider() {
    const range = el('input', {type: 'range', min: '0', max: '0', value: '0', 'aria-label': texts.cost});
    const told = el('output', {}, texts.noCost);
    let timer = 0;
    const {costs, segments} = this.scales;
    range.max = String(costs.length);
    range.value = String(costs.indexOf(this.cost) + 1);
    const show = () => {
      const at = range.valueAsNumber - 1;
      told.textContent = at < 0 ? texts.noCost : texts.costValue(shortNumber(costs[at]), segments[at]);
      range.setAttribute('aria-valuetext', told.textContent);
      return at < 0 ? 0 : costs[at];
    };
    show();
    range.addEventListener('input', () => {
      const cost = show();
      clearTimeout(timer);
      timer = setTimeout(() => this.setCost(cost), kWaitMs);
    });
    return el('div', {class: 'slider'}, field(texts.cost, range), told);
  }
}
