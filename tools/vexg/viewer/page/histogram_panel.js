// Bands, stretch and histograms of one raster. The ends of a histogram can be dragged, or typed.
import {choice, el, field, number, panel, shortNumber} from './dom.js';
import {texts} from './texts.js';

const kWidth = 256, kHeight = 64;

/** The histogram of one channel, with its two ends. */
class HistogramView {
  constructor(image, channel, color) {
    this.image = image;
    this.channel = channel;
    this.color = color;
    this.canvas = el('canvas', {width: kWidth, height: kHeight, class: 'histogram', role: 'img'});
    this.inputs = [0, 1].map((side) => number(0, {}, (value) => image.setEnd(this.band(), side, value)));
    this.inputs.forEach((input, side) => {
      input.setAttribute('aria-label', (side ? texts.high : texts.low)(this.name()));
    });
    this.canvas.addEventListener('pointerdown', (event) => this.begin(event));
    this.canvas.addEventListener('pointermove', (event) => this.drag(event));
    this.root = el('div', {class: 'histogram-box'}, el('span', {class: 'channel'}, ''), this.canvas,
      el('div', {class: 'ends'}, ...this.inputs));
  }

  band() { return this.image.shownBands()[this.channel]; }
  name() { return this.image.style.mode === 'color' ? texts.channels[this.channel] : texts.grey; }

  valueAt(event) {
    const {min, max} = this.histogram;
    const box = this.canvas.getBoundingClientRect();
    const at = Math.min(1, Math.max(0, (event.clientX - box.left) / box.width));
    const value = min + at * (max - min);
    return Number.isInteger(min) && max - min > 64 ? Math.round(value) : Number(value.toPrecision(5));
  }

  begin(event) {
    if (!this.histogram) return;
    const [low, high] = this.image.endsOfBand(this.band());
    const value = this.valueAt(event);
    this.side = Math.abs(value - low) < Math.abs(value - high) ? 0 : 1;
    this.canvas.setPointerCapture(event.pointerId);
    this.drag(event);
  }

  drag(event) {
    if (!this.canvas.hasPointerCapture(event.pointerId)) return;
    this.image.setEnd(this.band(), this.side, this.valueAt(event));
  }

  update() {
    this.histogram = this.image.histograms.get(this.band());
    const {band: number_} = this.histogram ?? {band: this.band()};
    this.root.firstChild.textContent = `${this.name()}: ${texts.band(number_, this.image.raster.bandNames[number_])}`;
    const [low, high] = this.image.endsOfBand(this.band());
    this.inputs[0].value = Number(low.toPrecision(7));
    this.inputs[1].value = Number(high.toPrecision(7));
    this.canvas.setAttribute('aria-label', texts.histogram(this.name(), shortNumber(low), shortNumber(high)));
    this.draw(low, high);
  }

  draw(low, high) {
    const context = this.canvas.getContext('2d');
    const style = getComputedStyle(document.documentElement);
    context.clearRect(0, 0, kWidth, kHeight);
    if (!this.histogram || this.histogram.min === null) return;
    const {min, max, binSize, counts} = this.histogram;
    const span = max - min || 1;
    const columns = new Float64Array(kWidth);
    // A bin over all its columns, or the mean of the bins of a column.
    const shown = Math.max(1, Math.round((span + (binSize === 1 ? 1 : 0)) / binSize));
    for (let x = 0; x < kWidth; ++x) {
      const from = Math.floor((x * shown) / kWidth);
      const to = Math.max(from + 1, Math.floor(((x + 1) * shown) / kWidth));
      for (let bin = from; bin < to; ++bin) columns[x] += (counts[bin] ?? 0) / (to - from);
    }
    const top = Math.sqrt(columns.reduce((most, count) => Math.max(most, count), 0)) || 1;
    const left = ((low - min) / span) * kWidth, right = ((high - min) / span) * kWidth;
    for (let x = 0; x < kWidth; ++x) {
      const height = (Math.sqrt(columns[x]) / top) * (kHeight - 4);
      context.fillStyle = x >= left && x <= right ? this.color : style.getPropertyValue('--outside');
      context.fillRect(x, kHeight - height, 1, height);
    }
    context.fillStyle = style.getPropertyValue('--handle');
    for (const x of [left, right]) {
      const at = Math.min(kWidth - 3, Math.max(0, x - 1.5));
      context.fillRect(at, 0, 3, kHeight);
      context.fillRect(Math.min(kWidth - 9, Math.max(0, at - 3)), 0, 9, 8);
    }
  }
}

/** The panel of one image. */
export function bandsPanel(images) {
  let image = images[0];
  const body = el('div');

  function bandChoice(value, onChange) {
    const options = image.raster.bandNames.map((name, band) => [band, texts.band(band, name)]);
    return choice(options, value, (chosen) => onChange(Number(chosen)));
  }

  function build() {
    const {style, raster} = image;
    const modes = Object.entries(texts.modes).filter(([mode]) =>
      mode !== 'palette' || (raster.legend && image.array.BYTES_PER_ELEMENT <= 2));
    const rows = [];
    if (images.length > 1) {
      rows.push(field(texts.shownRaster, choice(images.map((each, at) => [at, each.raster.name]), images.indexOf(image),
        (at) => { image = images[at]; build(); })));
    }
    rows.push(field(texts.mode, choice(modes, style.mode, async (mode) => { await image.change({mode}); build(); })));
    if (style.mode === 'color') {
      texts.channels.forEach((name, channel) => rows.push(field(name, bandChoice(style.channels[channel], (band) => {
        image.change({channels: style.channels.map((old, at) => (at === channel ? band : old))});
      }))));
    } else if (style.mode === 'grey') {
      rows.push(field(texts.grey, bandChoice(style.grey, (grey) => image.change({grey}))));
    }
    if (style.mode !== 'palette') rows.push(...stretchRows());
    body.replaceChildren(...rows);
    update();
  }

  let views = [];
  let note = null;

  function stretchRows() {
    const {style} = image;
    const rows = [field(texts.stretch, choice(Object.entries(texts.stretches), style.kind, async (kind) => {
      await image.change({kind});
      build();
    }))];
    if (style.kind === 'percent') {
      rows.push(field(texts.percentCut, number(style.cut, {min: 0, max: 49, step: 0.5}, (cut) => image.change({cut}))));
    } else if (style.kind === 'deviation') {
      rows.push(field(texts.deviations, number(style.deviations, {min: 0.1, max: 10, step: 0.5},
        (deviations) => image.change({deviations}))));
    }
    rows.push(field(texts.curve, choice(Object.entries(texts.curves), style.curve, async (curve) => {
      await image.change({curve});
      build();
    })));
    if (style.curve === 'gamma') {
      rows.push(field(texts.gamma, number(style.gamma, {min: 0.1, max: 5, step: 0.1}, (gamma) => image.change({gamma}))));
    }
    const colors = style.mode === 'color' ? ['#d9534a', '#3f9b55', '#3d7fd0'] : ['#7a8894'];
    views = colors.map((color, channel) => new HistogramView(image, channel, color));
    note = el('p', {class: 'note'});
    return [...rows, ...views.map((view) => view.root), note];
  }

  function update() {
    if (image.style.mode === 'palette') return;
    views.forEach((view) => view.update());
    note.textContent = image.step > 1 ? texts.ofLevel(image.step) : '';
  }

  for (const each of images) each.listeners.push(() => { if (each === image) update(); });
  build();
  return panel(texts.bands, body);
}
