// Shapes over the scene, drawn as lines: those of a file, or the footprints and seams of a mosaic.
import {CircleStyle, Fill, GeoJSON, Stroke, Style, VectorLayer, VectorSource} from './ol.js';

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

/** A layer of each kind of shapes in a collection: [{name, layer}]. */
export function shapeLayers(name, collection) {
  const groups = new Map();
  for (const feature of collection.features) {
    const kind = feature.properties.layer;
    if (!groups.has(kind)) groups.set(kind, []);
    groups.get(kind).push({...feature, geometry: flip(feature.geometry)});
  }
  const format = new GeoJSON();
  return [...groups].map(([kind, features], at) => {
    const source = new VectorSource({features: format.readFeatures({type: 'FeatureCollection', features})});
    const style = styleOf(kColors[at % kColors.length], kind === 'seams');
    return {name: groups.size > 1 ? `${name}: ${kind}` : name, layer: new VectorLayer({source, style, zIndex: 20 + at})};
  });
}
