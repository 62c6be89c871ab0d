// The page: asks what there is to see, and puts it together.
import {bandsPanel} from './histogram_panel.js';
import {ClassLayer, legendPanel} from './class_layer.js';
import {save} from './dom.js';
import {ImageLayer} from './image_layer.js';
import {layersPanel} from './layers_panel.js';
import {PrintSheet, makePicture} from './map_picture.js';
import {Map as OlMap, OverviewMap, Projection, TileLayer, View, Zoom} from './ol.js';
import {Readout} from './readout.js';
import {RegionTool} from './region_tool.js';
import {ScaleBar} from './scale_bar.js';
import {SegmentLayer} from './segment_layer.js';
import {get, hasKey} from './server.js';
import {shapeLayers} from './shape_layer.js';
import {SwipeTool} from './swipe_tool.js';
import {texts} from './texts.js';
import {makeTools, showHelp, toggleDark} from './tools.js';

const kAliveMs = 20000;
const kSilentMs = 15000;
const kSmall = 4 << 20;  // pixels of a raster for which a pyramid changes nothing that can be seen

function say(text, isFault = false) {
  const notice = document.getElementById('notice');
  notice.textContent = text;
  notice.classList.toggle('fault', isFault);
}

function onFault(fault) {
  say(fault.status === 403 ? texts.refused : fault.message, true);
}

function makeMap(raster) {
  const extent = [0, -raster.lines, raster.samples, 0];
  const projection = new Projection({code: 'vexg:pixels', units: 'pixels', extent});
  const map = new OlMap({
    target: 'map', controls: [new Zoom()], pixelRatio: 1,
    view: new View({
      projection, center: [raster.samples / 2, -raster.lines / 2], resolution: 1, minResolution: 1 / 64,
      maxResolution: 4 * 2 ** (raster.levels - 1), showFullExtent: true, smoothResolutionConstraint: true,
    }),
  });
  map.getTargetElement().setAttribute('aria-label', texts.map);
  return {map, extent};
}

function makeLayers(scene, map) {
  const made = {images: [], classes: [], segments: []};
  const kinds = {image: [ImageLayer, made.images], classes: [ClassLayer, made.classes], labels: [SegmentLayer, made.segments]};
  const entries = scene.rasters.map((raster, number) => {
    const [Kind, list] = kinds[raster.role];
    const layer = new Kind(number, raster, map, onFault);
    list.push(layer);
    if (raster.role !== 'labels') map.addLayer(layer.layer);
    if (raster.role === 'labels') layer.layer.setZIndex(10);
    const canBuild = !raster.hasLevels && raster.samples * raster.lines > kSmall && raster.isFile && number === 0;
    return {name: raster.name, layer: layer.layer, number, canBuild};
  });
  return {...made, entries};
}

async function addShapes(scene, map, entries) {
  for (const [number, name] of scene.shapes.entries()) {
    for (const entry of await shapeLayers(map, number, name, onFault)) {
      map.addLayer(entry.layer);
      entries.push(entry);
    }
  }
}

async function savePicture(map) {
  const canvas = await makePicture(map);
  canvas.toBlob((blob) => save('view.png', blob));
}

/** The legends of what is shown, without what is hidden in them. */
function legendsOf(layers) {
  return layers.filter(({layer}) => layer.getVisible()).map(({raster, legend, hidden}) => ({
    name: raster.name,
    rows: legend.filter(({value, name, color}) => !hidden.has(value) && color[3] !== 0 && name !== ''),
  })).filter(({rows}) => rows.length > 0);
}

function makeOverview(map, image) {
  const {samples, lines} = image.raster;
  const whole = Math.max(samples, lines) / 150;
  const control = new OverviewMap({
    className: 'ol-overviewmap', collapsed: true, collapsible: true, tipLabel: texts.overview,
    layers: [new TileLayer({source: image.tiles.layer.getSource()})],
    view: new View({  // of all of it, and always in the middle
      projection: map.getView().getProjection(), resolution: whole, minResolution: whole, maxResolution: whole,
      extent: [samples / 2, -lines / 2, samples / 2, -lines / 2], constrainOnlyCenter: true,
    }),
  });
  let isThere = false;
  return () => {
    if (!isThere) map.addControl(control);
    isThere = true;
    control.setCollapsed(!control.getCollapsed());
    return !control.getCollapsed();
  };
}

async function start() {
  document.getElementById('tools').setAttribute('aria-label', texts.tools);
  if (!hasKey) { say(texts.noKey, true); return; }
  const scene = await get('scene');
  const first = scene.rasters[0];
  document.title = `${first.name} – ${texts.title}`;
  document.getElementById('title').textContent = first.name;
  const {map, extent} = makeMap(first);
  const fit = () => map.getView().fit(extent, {padding: [16, 16, 16, 16], maxZoom: 30});
  fit();
  const {images, classes, segments, entries} = makeLayers(scene, map);
  const started = Promise.all([
    ...images.map((image) => image.start()),
    ...segments.map((layer) => layer.start().then(() => map.addLayer(layer.layer)))]);

  const named = new Map(classes.map((layer) => [layer.number, layer]));
  const readout = new Readout(map, scene.rasters, {
    nameOf: (number, value) => {
      const name = named.get(number)?.nameOf(value);
      return name ? `${value} ${name}` : value;
    },
    bandsOf: (number) => images.find((image) => image.number === number)?.shownBands() ?? [0],
    costOf: () => segments.at(-1)?.cost ?? 0, onFault,
  });
  new ScaleBar(map, first);
  const region = new RegionTool(map, first, say, onFault);
  const swipe = images.length > 1 ? new SwipeTool(map, images[1].layer) : null;
  map.on('singleclick', ({coordinate: [x, y]}) => {
    if (!region.isDrawing) segments.at(-1)?.choose(Math.floor(x), Math.floor(-y));
  });
  const sheet = new PrintSheet(map, first.name, () => legendsOf([
    ...images.filter(({style}) => style.mode === 'palette').map((image) => ({
      layer: image.layer, raster: image.raster, legend: image.raster.legend, hidden: image.style.hidden})), ...classes]));
  const regionTool = {name: 'region', key: 'r', isToggle: true, run: () => region.toggle()};
  region.onEnd = () => regionTool.off();
  const tools = [
    {name: 'fit', key: 'f', run: fit},
    {name: 'actual', key: '1', run: () => map.getView().setResolution(1)},
    regionTool,
    {name: 'viewRegion', key: 'v', run: () => region.takeView()},
    ...(swipe ? [{name: 'swipe', key: 's', isToggle: true, run: () => swipe.toggle()}] : []),
    {name: 'overview', key: 'o', isToggle: true, run: makeOverview(map, images[0])},
    {name: 'picture', key: 'p', run: () => savePicture(map)},
    {name: 'print', key: 'i', run: () => sheet.print()},
    {name: 'dark', key: 'd', run: () => { toggleDark(); images.forEach((image) => image.refresh()); }},
    {name: 'help', key: '?', run: showHelp},
  ];
  makeTools(tools, () => {
    if (!region.isDrawing) return false;
    region.stop();
    region.source.clear();
    return true;
  });
  document.addEventListener('keydown', (event) => {
    if (event.key.toLowerCase() !== 'b' || event.ctrlKey || event.target.matches?.('input[type=number], select')) return;
    for (const layer of segments) layer.layer.setVisible(!layer.layer.getVisible());
  });

  await started;
  await addShapes(scene, map, entries);
  document.getElementById('panels').replaceChildren(
    layersPanel(entries, onFault), bandsPanel(images),
    ...images.filter(({style}) => style.mode === 'palette').map((image) => legendPanel({
      legend: image.raster.legend, hidden: image.style.hidden, refresh: () => image.refresh()})),
    ...classes.map(legendPanel), ...segments.map((layer) => layer.makePanel()));
  setInterval(() => get('alive', {signal: AbortSignal.timeout(kSilentMs)}).catch(onFault), kAliveMs);
  window.vexgView = {map, scene, images, classes, segments, region, readout, swipe};
  document.documentElement.dataset.ready = 'true';
}

start().catch(onFault);
