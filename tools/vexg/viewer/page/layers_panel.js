// What lies on the map: which of it is shown, and how much shines through.
import {el, panel, tick} from './dom.js';
import {get, post} from './server.js';
import {texts} from './texts.js';

const kLookMs = 500;  // between two looks at a pyramid that is being built

/** The row that builds a pyramid, for a raster whose coarse levels take long. */
function pyramidRow(entry, onFault) {
  const button = el('button', {type: 'button'}, texts.buildPyramid);
  const state = el('span', {role: 'status', class: 'note'});
  button.addEventListener('click', async () => {
    button.disabled = true;
    try {
      let told = await post(`pyramid/${entry.number}`);
      while (told.state === 'runs') {
        state.textContent = texts.buildingPyramid(Math.round(100 * told.progress));
        await new Promise((resolve) => setTimeout(resolve, kLookMs));
        told = await get('pyramid');
      }
      if (told.state === 'failed') throw new Error(told.fault);
      state.textContent = texts.pyramidDone;
      button.hidden = true;
    } catch (fault) {
      button.disabled = false;
      onFault(fault);
    }
  });
  return el('div', {class: 'row'}, button, state);
}

/**
 * The panel of layers, the uppermost first.
 * @param entries {name, layer, number, canBuild, note}
 */
export function layersPanel(entries, onFault) {
  const rows = [...entries].reverse().map((entry) => {
    const box = tick(entry.name, entry.layer.getVisible(), (isOn) => entry.layer.setVisible(isOn));
    box.input.setAttribute('aria-label', texts.visible(entry.name));
    entry.layer.on('change:visible', () => { box.input.checked = entry.layer.getVisible(); });
    const range = el('input', {type: 'range', min: '0', max: '100', 'aria-label': texts.opacity(entry.name)});
    range.value = String(Math.round(100 * entry.layer.getOpacity()));
    range.addEventListener('input', () => entry.layer.setOpacity(range.valueAsNumber / 100));
    return el('div', {class: 'layer'}, box.row, range,
      entry.note ? el('p', {class: 'note'}, entry.note) : null,
      entry.canBuild ? pyramidRow(entry, onFault) : null);
  });
  return panel(texts.layers, ...rows);
}
