// Tiles of raw values, from which pictures are painted here: a change of bands or stretch paints anew
// and asks the server for nothing.
import {ImageTile, TileGrid, TileLayer} from './ol.js';
import {getTile} from './server.js';

export const kSide = 256;

const kArrays = {
  Byte: Uint8Array, Char: Int8Array, UInt16: Uint16Array, Int16: Int16Array, UInt32: Uint32Array,
  Int32: Int32Array, Single: Float32Array, Double: Float64Array,
};
const kShownTypes = {Int64: 'Double', UInt64: 'Double', ComplexSingle: 'Single', ComplexDouble: 'Double'};

/** The array type of the values of a raster's tiles. */
export function arrayOf(raster) {
  return kArrays[raster.type] ?? kArrays[kShownTypes[raster.type]];
}

/** The bands that come with every tile: all of few, or those that are shown of many. */
export function bandsOfTiles(raster, shown) {
  const bytes = arrayOf(raster).BYTES_PER_ELEMENT * raster.bands;
  if (raster.bands <= 8 && bytes <= 32) return Array.from({length: raster.bands}, (_, band) => band);
  return [...new Set(shown)].sort((a, b) => a - b);
}

const kMostBytes = 384 << 20;
const kLeastTiles = 256;

/** The tiles of one raster as a layer of the map. */
export class PixelTiles {
  /**
   * @param number of the raster.
   * @param raster its description.
   * @param options
   *   bands: () => the bands that are wanted;
   *   paint: (tile, rgba) => paints the values of a tile into a Uint32Array, lowest byte red;
   *   edge: true for one pixel more to the right and below;
   *   query: () => further text of the request;
   *   onFault: (fault) => tells that a tile could not be had.
   */
  constructor(number, raster, options) {
    this.number = number;
    this.raster = raster;
    this.options = options;
    this.tiles = new Map();  // by key, the last used last
    this.bytes = 0;
    this.waiting = new Set();
    const resolutions = Array.from({length: raster.levels}, (_, z) => 2 ** (raster.levels - 1 - z));
    const extent = [0, -raster.lines, raster.samples, 0];
    this.grid = new TileGrid({extent, origin: [0, 0], resolutions, tileSize: kSide});
    this.layer = new TileLayer({source: this.makeSource(), cacheSize: 96, extent});
  }

  makeSource() {
    return new ImageTile({
      projection: 'vexg:pixels', tileGrid: this.grid, interpolate: false, transition: 0, wrapX: false,
      loader: (z, x, y, {signal}) => this.load(z, x, y, signal),
    });
  }

  async load(z, x, y, signal) {
    const level = this.raster.levels - 1 - z;
    const bands = this.options.bands();
    const query = this.options.query?.() ?? '';
    const key = `${level}/${x}/${y}?bands=${bands}${this.options.edge ? '&edge=1' : ''}${query}`;
    let tile = this.tiles.get(key);
    if (!tile) {
      let read = null;
      try {
        read = await getTile(`${this.number}/${key}`, signal);
      } catch (fault) {
        if (fault.name !== 'AbortError') this.options.onFault?.(fault);
        throw fault;
      }
      tile = this.keep(key, {level, x, y, bands, canvas: document.createElement('canvas')}, read);
    }
    this.tiles.delete(key);
    this.tiles.set(key, tile);
    this.paint(tile);
    return tile.canvas;
  }

  keep(key, tile, read) {
    tile.canvas.width = tile.canvas.height = kSide;
    tile.width = read?.width ?? 0;
    tile.height = read?.height ?? 0;
    const count = tile.width * tile.height * tile.bands.length;
    const array = arrayOf(this.raster);
    tile.values = read ? new array(read.bytes, 0, count) : new array(0);
    tile.states = read ? new Uint8Array(read.bytes, count * array.BYTES_PER_ELEMENT, count) : new Uint8Array(0);
    tile.size = (read?.bytes.byteLength ?? 0) + 4 * kSide * kSide;
    this.bytes += tile.size;
    for (const [old, dropped] of this.tiles) {
      if (this.bytes <= kMostBytes || this.tiles.size < kLeastTiles) break;
      this.tiles.delete(old);
      this.bytes -= dropped.size;
    }
    return tile;
  }

  paint(tile) {
    const context = tile.canvas.getContext('2d');
    const width = Math.min(tile.width, kSide), height = Math.min(tile.height, kSide);
    context.clearRect(0, 0, kSide, kSide);
    if (width === 0 || height === 0) return;
    const image = new ImageData(width, height);
    this.options.paint(tile, new Uint32Array(image.data.buffer), width, height);
    context.putImageData(image, 0, 0);
    tile.isStale = false;
  }

  /** Paints all tiles anew: those of the view at once, the others when there is time. */
  repaint(map) {
    const view = map.getView();
    const z = this.grid.getZForResolution(view.getResolution());
    const level = this.raster.levels - 1 - z;
    const [left, bottom, right, top] = view.calculateExtent(map.getSize());
    const side = kSide * 2 ** level;
    this.waiting.clear();
    for (const tile of this.tiles.values()) {
      const isShown = tile.level === level && tile.x * side < right && (tile.x + 1) * side > left &&
        tile.y * side < -bottom && (tile.y + 1) * side > -top;
      if (isShown) this.paint(tile); else this.waiting.add(tile);
    }
    this.layer.changed();
    this.paintWaiting();
  }

  paintWaiting() {
    if (this.isScheduled || this.waiting.size === 0) return;
    this.isScheduled = true;
    setTimeout(() => {
      this.isScheduled = false;
      const end = performance.now() + 20;
      for (const tile of this.waiting) {
        this.waiting.delete(tile);
        this.paint(tile);
        if (performance.now() > end) break;
      }
      if (this.waiting.size === 0) this.layer.changed();
      this.paintWaiting();
    }, 50);
  }

  /** Asks the server again: for other bands, or other labels. */
  reload() {
    this.layer.setSource(this.makeSource());
  }

  /** The value of a band at a place in the pixels of the level that is shown; undefined where no tile is there. */
  valueAt(level, x, y, band) {
    for (const tile of this.tiles.values()) {
      const inX = x - tile.x * kSide, inY = y - tile.y * kSide, at = tile.bands.indexOf(band);
      if (tile.level !== level || at < 0 || inX < 0 || inY < 0 || inX >= tile.width || inY >= tile.height) continue;
      return tile.values[(at * tile.height + inY) * tile.width + inX];
    }
    return undefined;
  }
}
