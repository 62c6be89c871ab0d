// What lies under the cursor: the pixel, its place on the map and the values of all rasters, read from
// their sources.
import {el} from './dom.js';
import {get} from './server.js';
import {texts} from './texts.js';

const kMostBands = 12;

export class Readout {
  /**
   * @param nameOf (number, value) => the text of a value of a raster.
   * @param bandsOf (number) => the bands of a raster that are shown.
   * @param costOf () => the cost up to which the segments of a tree are merged.
   */
  constructor(map, rasters, {nameOf, bandsOf, costOf, onFault}) {
    this.bandsOf = bandsOf;
    this.costOf = costOf;
    this.map = map;
    this.rasters = rasters;
    this.nameOf = nameOf;
    this.onFault = onFault;
    this.root = document.getElementById('readout');
    map.on('pointermove', (event) => { if (!event.dragging) this.look(event.coordinate); });
    map.on('moveend', () => {
      if (document.activeElement === map.getTargetElement() && this.isByKey) this.look(map.getView().getCenter());
      this.isByKey = false;
    });
    map.getTargetElement().addEventListener('keydown', () => { this.isByKey = true; });
  }

  look([x, y]) {
    this.wanted = [Math.floor(x), Math.floor(-y)];
    if (!this.isAsking) this.ask();
  }

  async ask() {
    const {samples, lines} = this.rasters[0];
    this.isAsking = true;
    while (this.wanted) {
      const [x, y] = this.wanted;
      this.wanted = null;
      if (x < 0 || y < 0 || x >= samples || y >= lines) {
        this.root.replaceChildren();
        continue;
      }
      try {
        this.show(await get(`pixel?x=${x}&y=${y}&cost=${this.costOf()}`));
      } catch (fault) {
        this.onFault(fault);
      }
    }
    this.isAsking = false;
  }

  show(told) {
    this.told = told;
    const parts = [[texts.pixel, `${told.x}, ${told.y}`]];
    if (told.place?.map) {
      const isFine = told.place.map.every((value) => Math.abs(value) < 1000);
      parts.push([texts.place, told.place.map.map((value) => value.toFixed(isFine ? 7 : 2)).join(', ')]);
    }
    if (told.place?.degrees) parts.push([texts.degrees, told.place.degrees.map((value) => value.toFixed(6)).join(', ')]);
    told.values.forEach((values, number) => {
      if (values === null) return;
      const text = (value) => (value === null ? texts.noData : this.nameOf(number, value));
      // Of many bands those that are shown.
      const shown = values.length <= kMostBands ? values.map(text)
        : [...new Set(this.bandsOf(number))].map((band) => `${texts.band(band, this.rasters[number].bandNames[band])} = ${text(values[band])}`);
      parts.push([this.rasters[number].name, shown.join(values.length <= kMostBands ? '  ' : '; ')]);
    });
    this.root.replaceChildren(...parts.map(([name, value]) =>
      el('span', {class: 'part'}, el('b', {}, name), ' ', el('span', {}, value))));
  }
}
