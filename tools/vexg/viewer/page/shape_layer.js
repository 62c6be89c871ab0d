// Shapes over the scene, drawn as lines: those of a file, or the footprints and seams of a mosaic.
import {el} from './dom.js';
import {CircleStyle, Fill, GeoJSON, Stroke, Style, VectorLayer, VectorSource} from './ol.js';
import {get} from './server.js';
import {texts} from './texts.js';

const kColors = ['#4fd1ff', '#ff9d3b', '#b58cff', '#7be07b'];

function styleOf(color, isSeam) {
  const stroke = new Stroke({color, width: isSeam ? 2 : 1.5, lineDash: isSeam ? [6, 4] : undefined});
  return new Style({stroke, fill: new Fill({color: 'rgba(0,0,0,0)'}),
    image: new CircleStyle({radius: 4, fill: new Fill({color}), stroke: new Stroke({color: '#00000080', width: 1})})});
}

/** Turns pixels, whose lines run down, into the coordinates of the map, whose y runs up. */
function flip(geometry) {
  const turn = (part) => (typeof part[0] === 'number' ? [part[0], -part[1]] : part.map(turn));
  return {...geometry, coordinates: turn(geometry.coordinates)};
}

/** The features of a collection by their kinds. */
function groupsOf(collection) {
  const groups = new Map();
  for (const feature of collection.features) {
    const kind = feature.properties.layer;
    if (!groups.has(kind)) groups.set(kind, []);
    groups.get(kind).push({...feature, geometry: flip(feature.geometry)});
  }
  const format = new GeoJSON();
  for (const [kind, features] of groups) groups.set(kind, format.readFeatures({type: 'FeatureCollection', features}));
  return groups;
}

/** Has the layers show what the server gives for each view; a large file is never here as a whole. */
function follow(map, number, layers, note, onFault) {
  let isAsking = false, isStale = false;
  const ask = async () => {
    isStale = true;
    if (isAsking) return;
    isAsking = true;
    while (isStale) {
      isStale = false;
      const [left, bottom, right, top] = map.getView().calculateExtent(map.getSize());
      try {
        const told = await get(`shapes/${number}?rect=${left},${-top},${right},${-bottom}&step=${map.getView().getResolution()}`);
        const groups = groupsOf(told);
        for (const [kind, layer] of layers) {
          layer.getSource().clear(true);
          layer.getSource().addFeatures(groups.get(kind) ?? []);
        }
        note.textContent = told.left > 0 ? texts.shapesLeft(told.left, told.inView) : '';
      } catch (fault) {
        onFault(fault);
      }
    }
    isAsking = false;
  };
  map.on('moveend', ask);
  ask();
}

/** A layer of each kind of shapes in a collection: [{name, layer, note}]. */
export async function shapeLayers(map, number, name, onFault) {
  const collection = await get(`shapes/${number}`);
  const groups = groupsOf(collection);
  const kinds = collection.isWhole ? [...groups.keys()] : collection.layers;
  const note = collection.isWhole ? undefined : el('span', {role: 'status'});
  const layers = kinds.map((kind, at) => {
    const source = new VectorSource({features: groups.get(kind) ?? []});
    const style = styleOf(kColors[at % kColors.length], kind === 'seams');
    return [kind, new VectorLayer({source, style, zIndex: 20 + at})];
  });
  if (!collection.isWhole) follow(map, number, layers, note, onFault);
  return layers.map(([kind, layer], at) => ({
    name: kinds.length > 1 ? `${name}: ${kind}` : name, layer, note: at === kinds.length - 1 ? note : undefined}));
}
