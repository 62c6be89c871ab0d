// Small makers of elements, so that every control has its label.

/** Makes an element. Attributes whose name begins with "on" are listeners, others properties or attributes. */
export function el(tag, attributes = {}, ...children) {
  const made = document.createElement(tag);
  for (const [name, value] of Object.entries(attributes)) {
    if (name.startsWith('on')) made.addEventListener(name.slice(2), value);
    else if (name in made && typeof value !== 'string') made[name] = value;
    else made.setAttribute(name, value);
  }
  made.append(...children.filter((child) => child !== null && child !== undefined));
  return made;
}

let made = 0;

/** A control with its label in front. */
export function field(label, control) {
  control.id ||= `control-${++made}`;
  return el('div', {class: 'field'}, el('label', {for: control.id}, label), control);
}

/** A list to choose from. @param options pairs of value and text. */
export function choice(options, value, onChange) {
  const select = el('select', {onchange: () => onChange(select.value)},
    ...options.map(([key, text]) => el('option', {value: String(key)}, text)));
  select.value = String(value);
  return select;
}

/** A number with bounds. */
export function number(value, {min, max, step}, onChange) {
  const input = el('input', {type: 'number', min: String(min ?? ''), max: String(max ?? ''), step: String(step ?? 'any')});
  input.value = value;
  input.addEventListener('change', () => {
    if (Number.isFinite(input.valueAsNumber)) onChange(input.valueAsNumber);
  });
  return input;
}

/** A box to tick with its label behind. */
export function tick(label, isOn, onChange) {
  const input = el('input', {type: 'checkbox', id: `control-${++made}`, onchange: () => onChange(input.checked)});
  input.checked = isOn;
  return {input, row: el('div', {class: 'tick'}, input, el('label', {for: input.id}, label))};
}

/** A part of the side panel that folds. */
export function panel(title, ...children) {
  return el('details', {class: 'panel', open: true}, el('summary', {}, el('h2', {}, title)), ...children);
}

/** A number with the digits that a reader wants. */
export function shortNumber(value) {
  if (value === null || value === undefined) return '–';
  if (Number.isInteger(value)) return String(value);
  const size = Math.abs(value);
  return size !== 0 && (size < 1e-3 || size >= 1e7) ? value.toExponential(4) : String(Number(value.toPrecision(6)));
}

/** Lets the browser save a text or a blob under a name. */
export function save(name, content, type) {
  const address = URL.createObjectURL(content instanceof Blob ? content : new Blob([content], {type}));
  el('a', {href: address, download: name}).click();
  setTimeout(() => URL.revokeObjectURL(address), 10000);
}
