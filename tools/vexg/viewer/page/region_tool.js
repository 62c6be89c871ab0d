// A region that the user draws: its statistics, and a file of it.
import {card, tableOf} from './cards.js';
import {el, save, shortNumber} from './dom.js';
import {Draw, Feature, Fill, Stroke, Style, VectorLayer, VectorSource, fromExtent} from './ol.js';
import {post} from './server.js';
import {texts} from './texts.js';

export class RegionTool {
  constructor(map, raster, say, onFault) {
    this.map = map;
    this.raster = raster;
    this.say = say;
    this.onFault = onFault;
    this.source = new VectorSource();
    const style = new Style({stroke: new Stroke({color: '#ff4fa3', width: 2}), fill: new Fill({color: 'rgba(255,79,163,0.12)'})});
    this.layer = new VectorLayer({source: this.source, style, zIndex: 50});
    map.addLayer(this.layer);
    this.draw = null;
  }

  get isDrawing() { return this.draw !== null; }

  toggle() {
    if (this.draw) { this.stop(); return false; }
    this.draw = new Draw({source: this.source, type: 'Polygon'});
    this.draw.on('drawstart', () => this.source.clear());
    this.draw.on('drawend', ({feature}) => {
      setTimeout(() => this.stop(), 0);
      this.measure(feature);
    });
    this.map.addInteraction(this.draw);
    this.say(texts.regionHint);
    return true;
  }

  stop() {
    if (!this.draw) return;
    this.map.removeInteraction(this.draw);
    this.draw = null;
    this.say('');
    this.onEnd?.();
  }

  /** Takes the part of the raster that is in view as the region. */
  takeView() {
    const [left, bottom, right, top] = this.map.getView().calculateExtent(this.map.getSize());
    const {samples, lines} = this.raster;
    const extent = [Math.max(0, left), Math.max(-lines, bottom), Math.min(samples, right), Math.min(0, top)];
    if (!(extent[2] > extent[0] && extent[3] > extent[1])) return;
    const feature = new Feature(fromExtent(extent));
    this.source.clear();
    this.source.addFeature(feature);
    this.measure(feature);
  }

  async measure(feature) {
    const ring = feature.getGeometry().getCoordinates()[0].map(([x, y]) => [x, -y]);
    const shown = card('region', texts.regionTitle('…'), (isUser) => { if (isUser) this.source.clear(); });
    try {
      const told = await post('region/0', {ring});
      shown.setTitle(texts.regionTitle(told.pixels));
      const {columns} = texts, keys = Object.keys(columns);
      const saving = el('button', {type: 'button', onclick: () =>
        save('region.geojson', JSON.stringify(told.geoJson), 'application/geo+json')}, texts.saveGeoJson);
      const removing = el('button', {type: 'button', onclick: () => shown.root.close(true)}, texts.remove);
      const table = told.pixels === 0 ? el('p', {}, texts.regionNone)
        : tableOf(keys.map((key) => columns[key]), told.bands.map((band) =>
          keys.map((key) => (key === 'band' ? texts.band(band.band, this.raster.bandNames[band.band]) : shortNumber(band[key])))));
      shown.fill(table, el('div', {class: 'row'}, saving, removing));
      this.told = told;
    } catch (fault) {
      shown.say(fault.message);
      this.onFault(fault);
    }
  }
}
