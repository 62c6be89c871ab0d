// How values become brightness: ends from the histogram, and a curve between them.

const kSteps = 1024;  // of a curve, for values that are not small whole numbers

/** The value below which a share of the counted values lies. */
export function percentile(histogram, share) {
  const total = histogram.counts.reduce((sum, count) => sum + count, 0);
  let rest = share * total;
  for (let bin = 0; bin < histogram.counts.length; ++bin) {
    const count = histogram.counts[bin];
    if (rest <= count && count > 0) {
      const whole = histogram.binSize === 1 && Number.isInteger(histogram.min);
      const at = whole ? 0 : rest / count;
      return Math.min(histogram.min + (bin + at) * histogram.binSize, histogram.max);
    }
    rest -= count;
  }
  return histogram.max;
}

/** The mean and the deviation, from the middles of the bins. */
export function moments(histogram) {
  const whole = histogram.binSize === 1 && Number.isInteger(histogram.min);
  let count = 0, sum = 0, squares = 0;
  histogram.counts.forEach((here, bin) => {
    const value = histogram.min + (bin + (whole ? 0 : 0.5)) * histogram.binSize;
    count += here;
    sum += here * value;
    squares += here * value * value;
  });
  const mean = count ? sum / count : 0;
  return {mean, deviation: count > 1 ? Math.sqrt(Math.max(0, (squares - sum * mean) / (count - 1))) : 0};
}

/** The dark and the bright end that a rule gives. */
export function endsOf(histogram, rule) {
  if (!histogram || histogram.min === null) return [0, 1];
  let ends = [histogram.min, histogram.max];
  if (rule.kind === 'percent') {
    ends = [percentile(histogram, rule.cut / 100), percentile(histogram, 1 - rule.cut / 100)];
  } else if (rule.kind === 'deviation') {
    const {mean, deviation} = moments(histogram);
    ends = [Math.max(histogram.min, mean - rule.deviations * deviation),
      Math.min(histogram.max, mean + rule.deviations * deviation)];
  }
  if (!(ends[1] > ends[0])) ends = [histogram.min, histogram.max];
  return ends[1] > ends[0] ? ends : [ends[0], ends[0] + 1];
}

/** The brightness, 0 to 1, of a place between the ends. */
export function bend(at, curve, gamma) {
  if (curve === 'sqrt') return Math.sqrt(at);
  if (curve === 'gamma') return at ** (1 / gamma);
  if (curve === 'log') return Math.log1p(99 * at) / Math.log(100);
  return at;
}

/** A table by which values of a type become bytes. */
export class BrightnessTable {
  constructor(array, [low, high], curve, gamma) {
    const bytes = array.BYTES_PER_ELEMENT;
    this.isWhole = bytes <= 2 && !(array === Float32Array);
    const size = this.isWhole ? 2 ** (8 * bytes) : kSteps + 1;
    this.offset = array === Int8Array ? 128 : array === Int16Array ? 32768 : 0;
    this.low = low;
    this.scale = kSteps / (high - low);
    this.levels = new Uint8Array(size);
    for (let i = 0; i < size; ++i) {
      const at = this.isWhole ? (i - this.offset - low) / (high - low) : i / kSteps;
      this.levels[i] = Math.round(255 * bend(Math.min(1, Math.max(0, at)), curve, gamma));
    }
  }

  /** Fills `out` with the bytes of a run of values. */
  fill(values, from, count, out) {
    const {levels, offset, low, scale} = this;
    if (this.isWhole) {
      for (let i = 0; i < count; ++i) out[i] = levels[values[from + i] + offset];
      return;
    }
    for (let i = 0; i < count; ++i) {
      const at = (values[from + i] - low) * scale;
      out[i] = levels[at <= 0 ? 0 : at >= kSteps ? kSteps : (at + 0.5) | 0];
    }
  }
}

const rows = [0, 1, 2].map(() => new Uint8Array(512));

/**
 * Paints three channels of a tile. Pixels that do not count in one of the bands stay clear, and so do
 * those that are no numbers.
 * @param places of the channels among the bands of the tile.
 */
export function paintChannels(tile, rgba, width, height, places, tables) {
  const plane = tile.width * tile.height;
  const isFloat = tile.values instanceof Float32Array || tile.values instanceof Float64Array;
  for (let y = 0; y < height; ++y) {
    const row = y * tile.width;
    for (let channel = 0; channel < 3; ++channel) {
      if (channel > 0 && places[channel] === places[0] && tables[channel] === tables[0]) {
        rows[channel].set(rows[0]);
      } else {
        tables[channel].fill(tile.values, places[channel] * plane + row, width, rows[channel]);
      }
    }
    const a = places[0] * plane + row, b = places[1] * plane + row, c = places[2] * plane + row;
    for (let x = 0; x < width; ++x) {
      if (tile.states[a + x] | tile.states[b + x] | tile.states[c + x]) continue;
      if (isFloat && !(tile.values[a + x] - tile.values[a + x] === 0 && tile.values[b + x] - tile.values[b + x] === 0 &&
          tile.values[c + x] - tile.values[c + x] === 0)) continue;
      rgba[y * width + x] = (255 << 24) | (rows[2][x] << 16) | (rows[1][x] << 8) | rows[0][x];
    }
  }
}

/** Paints the values of a band by a table of colours, 0 for those that are not shown. */
export function paintPalette(tile, rgba, width, height, place, colors) {
  const plane = tile.width * tile.height;
  for (let y = 0; y < height; ++y) {
    const row = place * plane + y * tile.width;
    for (let x = 0; x < width; ++x) {
      if (tile.states[row + x] === 0) rgba[y * width + x] = colors[tile.values[row + x]] ?? 0;
    }
  }
}

/** The colours of a legend as numbers, lowest byte red; those of hidden values are clear. */
export function colorsOf(legend, hidden) {
  return Uint32Array.from(legend, ({value, color: [r, g, b, a]}) =>
    hidden.has(value) ? 0 : (a << 24) | (b << 16) | (g << 8) | r);
}
