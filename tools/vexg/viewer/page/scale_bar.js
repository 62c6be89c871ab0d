// A bar of a round length on the ground, from the longitudes and latitudes of two pixels.
import {get} from './server.js';
import {texts} from './texts.js';

const kEarth = 6371008.8;  // m, the mean radius (Moritz 2000)

/** The way on the ground between two places, by the haversine formula (Sinnott 1984). */
function distance([lon1, lat1], [lon2, lat2]) {
  const rad = Math.PI / 180;
  const a = Math.sin(((lat2 - lat1) * rad) / 2) ** 2 +
    Math.cos(lat1 * rad) * Math.cos(lat2 * rad) * Math.sin(((lon2 - lon1) * rad) / 2) ** 2;
  return 2 * kEarth * Math.asin(Math.min(1, Math.sqrt(a)));
}

export class ScaleBar {
  constructor(map, raster) {
    this.map = map;
    this.metres = null;  // of a pixel
    map.on('moveend', () => this.update());
    this.measure(raster).then(() => this.update());
  }

  async measure({samples, lines}) {
    const x = Math.floor(samples / 2), y = Math.floor(lines / 2), far = Math.floor((samples - 1 - x) / 2);
    if (far < 1) return;
    try {
      const [a, b] = await Promise.all([get(`pixel?x=${x}&y=${y}`), get(`pixel?x=${x + far}&y=${y}`)]);
      if (a.place?.degrees && b.place?.degrees) this.metres = distance(a.place.degrees, b.place.degrees) / far || null;
    } catch {
      this.metres = null;
    }
  }

  update() {
    const resolution = this.map.getView().getResolution();
    if (!resolution) return;
    const unit = resolution * (this.metres ?? 1);
    const most = 160 * unit;
    const power = 10 ** Math.floor(Math.log10(most));
    const length = [5, 2, 1].map((n) => n * power).find((n) => n <= most);
    const round = (value) => String(Number(value.toPrecision(3)));
    const text = this.metres === null ? texts.pixels(round(length))
      : length >= 1000 ? texts.kilometres(round(length / 1000)) : texts.metres(round(length));
    document.getElementById('scale-text').textContent = text;
    document.getElementById('scale-line').style.width = `${length / unit}px`;
    document.getElementById('scale').setAttribute('aria-label', texts.scale(text));
  }
}
