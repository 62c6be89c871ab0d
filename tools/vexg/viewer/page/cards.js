// Cards over the map: what was found out about a segment or a region.
import {el} from './dom.js';
import {texts} from './texts.js';

/** Opens a card in place of the one of the same kind. */
export function card(kind, title, onClose) {
  const holder = document.getElementById('cards');
  for (const old of holder.querySelectorAll(`[data-kind="${kind}"]`)) old.close(false);
  const heading = el('h2', {}, title);
  const body = el('div', {class: 'card-body', tabindex: '0', role: 'group', 'aria-label': title}, texts.working);
  const root = el('section', {class: 'card', 'data-kind': kind, 'aria-label': title},
    el('header', {}, heading, el('button', {type: 'button', class: 'close', title: texts.close, 'aria-label': texts.close,
      onclick: () => root.close(true)}, '×')), body);
  root.close = (isUser) => {
    root.remove();
    onClose?.(isUser);
  };
  holder.append(root);
  return {
    root,
    isOpen: () => root.isConnected,
    say: (text) => body.replaceChildren(el('p', {role: 'status'}, text)),
    fill: (...children) => body.replaceChildren(...children),
    setTitle: (text) => {
      heading.textContent = text;
      root.setAttribute('aria-label', text);
      body.setAttribute('aria-label', text);
    },
    close: () => root.close(false),
  };
}

/** Closes the card that was opened last. @return false when there is none. */
export function closeLastCard() {
  const last = document.getElementById('cards').lastElementChild;
  last?.close(true);
  return last !== null;
}

/** A table of texts. */
export function tableOf(columns, rows) {
  return el('table', {}, el('thead', {}, el('tr', {}, ...columns.map((name) => el('th', {scope: 'col'}, name)))),
    el('tbody', {}, ...rows.map((row) => el('tr', {}, ...row.map((cell, at) =>
      el(at ? 'td' : 'th', at ? {} : {scope: 'row'}, cell))))));
}
