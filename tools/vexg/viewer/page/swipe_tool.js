// A bar between two rasters: the upper one is shown to the right of it.
import {getRenderPixel} from './ol.js';
import {texts} from './texts.js';

export class SwipeTool {
  constructor(map, layer) {
    this.map = map;
    this.layer = layer;
    this.bar = document.getElementById('swipe');
    this.range = document.getElementById('swipe-range');
    this.range.setAttribute('aria-label', texts.swipeBar);
    this.range.addEventListener('input', () => this.move());
    this.bar.addEventListener('pointerdown', (event) => this.begin(event));
    this.bar.addEventListener('pointermove', (event) => this.drag(event));
    layer.on('prerender', (event) => this.clip(event));
    layer.on('postrender', (event) => { if (this.isOn) event.context.restore(); });
  }

  get isOn() { return !this.bar.hidden; }

  toggle() {
    this.bar.hidden = !this.bar.hidden;
    if (this.isOn) this.layer.setVisible(true);
    this.move();
    return this.isOn;
  }

  begin(event) {
    if (event.target === this.range) return;
    this.bar.setPointerCapture(event.pointerId);
    this.drag(event);
    event.preventDefault();
  }

  drag(event) {
    if (!this.bar.hasPointerCapture(event.pointerId)) return;
    const box = this.map.getTargetElement().getBoundingClientRect();
    this.range.value = String(Math.round((1000 * (event.clientX - box.left)) / box.width));
    this.move();
  }

  move() {
    this.bar.style.left = `${this.range.valueAsNumber / 10}%`;
    this.map.render();
  }

  clip({context, ...event}) {
    if (!this.isOn) return;
    const [width, height] = this.map.getSize();
    const at = (width * this.range.valueAsNumber) / 1000;
    const corners = [[at, 0], [width, 0], [width, height], [at, height]]
      .map((corner) => getRenderPixel({context, ...event, frameState: event.frameState}, corner));
    context.save();
    context.beginPath();
    corners.forEach(([x, y], i) => (i ? context.lineTo(x, y) : context.moveTo(x, y)));
    context.closePath();
    context.clip();
  }
}
