// A raster as a picture: which bands, between which ends, by which curve.
import {PixelTiles, arrayOf, bandsOfTiles} from './pixel_tiles.js';
import {get} from './server.js';
import {BrightnessTable, colorsOf, endsOf, paintChannels, paintPalette} from './stretch.js';

const kNatural = [650, 550, 470];  // nm

/** The bands that look natural: by their meanings, names or wavelengths, else the first ones. */
function naturalBands(raster) {
  for (const list of [raster.bandMeanings, raster.bandNames]) {
    const lower = list.map((name) => name.toLowerCase());
    const named = ['red', 'green', 'blue'].map((color) => lower.indexOf(color));
    if (named.every((band) => band >= 0)) return named;
  }
  const known = raster.wavelengths.flatMap((value, band) => (value === null ? [] : [{value, band}]));
  const nearest = kNatural.map((wanted) => known.reduce(
    (best, each) => (Math.abs(each.value - wanted) < Math.abs(best.value - wanted) ? each : best), {value: Infinity, band: -1}));
  if (nearest.every(({value}, at) => Math.abs(value - kNatural[at]) < 40)) return nearest.map(({band}) => band);
  if (raster.bands >= 3) return raster.bands > 4 ? [2, 1, 0] : [0, 1, 2];
  return [0, 0, 0];
}

export class ImageLayer {
  constructor(number, raster, map, onFault) {
    this.number = number;
    this.raster = raster;
    this.map = map;
    this.array = arrayOf(raster);
    this.histograms = new Map();
    this.step = 1;  // of the pixels that were counted
    const isMap = raster.legend !== null && this.array.BYTES_PER_ELEMENT <= 2;
    this.style = {
      mode: isMap ? 'palette' : raster.bands >= 3 ? 'color' : 'grey',
      channels: naturalBands(raster), grey: 0,
      kind: 'percent', cut: 2, deviations: 2, curve: 'linear', gamma: 1.5,
      ends: {}, hidden: new Set(),
    };
    this.tiles = new PixelTiles(number, raster, {
      bands: () => bandsOfTiles(raster, this.shownBands()), onFault,
      paint: (tile, rgba, width, height) => this.paint(tile, rgba, width, height),
    });
    this.onFault = onFault;
    this.listeners = [];
  }

  get layer() { return this.tiles.layer; }

  /** The bands of the red, green and blue channel. */
  shownBands() {
    const {mode, channels, grey} = this.style;
    return mode === 'color' ? channels : mode === 'palette' ? [0, 0, 0] : [grey, grey, grey];
  }

  /** Asks for the histograms that are missing, of all bands where there are few. */
  async start() {
    await this.count();
    this.refresh();
  }

  async count() {
    if (this.style.mode === 'palette' && this.histograms.size === 0 && this.raster.bands === 1) return;
    const wanted = bandsOfTiles(this.raster, this.shownBands()).filter((band) => !this.histograms.has(band));
    if (wanted.length === 0) return;
    const told = await get(`bands/${this.number}?bands=${wanted}`);
    for (const histogram of told.bands) this.histograms.set(histogram.band, histogram);
    this.step = 2 ** told.level;
  }

  /** The dark and the bright end of a band. */
  endsOfBand(band) {
    const {kind, ends} = this.style;
    if (kind === 'manual' && ends[band]) return ends[band];
    return endsOf(this.histograms.get(band), this.style);
  }

  /** Changes the style, and paints anew. Only for bands that no tile has is the server asked. */
  async change(change) {
    const before = String(bandsOfTiles(this.raster, this.shownBands()));
    if (change.kind === 'manual') {
      for (const band of this.shownBands()) this.style.ends[band] ??= this.endsOfBand(band);
    }
    Object.assign(this.style, change);
    const isNew = String(bandsOfTiles(this.raster, this.shownBands())) !== before;
    if (isNew || this.shownBands().some((band) => !this.histograms.has(band))) {
      await this.count().catch(this.onFault);
    }
    if (isNew) this.tiles.reload();
    this.refresh();
  }

  /** Sets one end of a band by hand. */
  setEnd(band, side, value) {
    if (this.style.kind !== 'manual') this.change({kind: 'manual'});
    const ends = [...this.endsOfBand(band)];
    ends[side] = value;
    if (!(ends[1] > ends[0])) return;
    this.style.ends[band] = ends;
    this.refresh();
  }

  refresh() {
    const begin = performance.now();
    const {mode, curve, gamma, hidden} = this.style;
    if (mode === 'palette') {
      this.colors = colorsOf(this.raster.legend, hidden);
    } else {
      const made = new Map();
      this.tables = this.shownBands().map((band) => {
        if (!made.has(band)) made.set(band, new BrightnessTable(this.array, this.endsOfBand(band), curve, gamma));
        return made.get(band);
      });
    }
    this.tiles.repaint(this.map);
    this.repaintMs = performance.now() - begin;
    for (const listener of this.listeners) listener();
  }

  paint(tile, rgba, width, height) {
    const places = this.shownBands().map((band) => tile.bands.indexOf(band));
    if (places.some((place) => place < 0)) return;
    if (this.style.mode === 'palette') {
      if (this.colors) paintPalette(tile, rgba, width, height, places[0], this.colors);
    } else if (this.tables) {
      paintChannels(tile, rgba, width, height, places, this.tables);
    }
  }
}
