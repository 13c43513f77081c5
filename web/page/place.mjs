/** Asks for a folder: of one connection, or of any that is connected. */
import { get, sentences } from './api.mjs';
import { ask, field, paragraph } from './dialogs.mjs';
import { element, icon } from './dom.mjs';
import { join, parentOf } from './paths.mjs';
import { sorted } from './sort.mjs';

let connections = () => [];

/** Where the connections are learned from. */
export function setConnections(source) {
  connections = source;
}

/** Gives {connection, path}, or null. `only` keeps to one connection, `from` is the first choice. */
export function askPlace({ title, accept, only = null, from = null, path = '/' }) {
  const offered = only ? [only] : connections().filter(({ state }) => state === 'connected');
  const choice = element('select', { onchange: () => show('/') }, ...offered.map(
    ({ id, alias }) => element('option', { value: id, textContent: alias })));
  choice.value = (only ?? from ?? offered[0])?.id;
  const place = element('p', { className: 'place', role: 'status' });
  const folders = element('ul', { className: 'choices' });
  let here = path;
  let asked = 0;

  function item(text, name, to) {
    return element('li', {}, element('button', { type: 'button', onclick: () => show(to, true) },
      icon(name), element('span', { textContent: text })));
  }

  async function show(to, focus = false) {
    asked += 1;
    const mine = asked;
    here = to;
    place.textContent = `In ${to}`;
    const up = to === '/' ? [] : [item('The folder above', 'folder', parentOf(to))];
    let below;
    try {
      const { entries } = await get('list', { connection: choice.value, path: to });
      below = sorted(entries.filter((entry) => entry.folder), 'name', false)
        .map((entry) => item(entry.name, 'folder', join(to, entry.name)));
    } catch (error) {
      below = [element('li', {}, paragraph(sentences(error), 'problem'))];
    }
    if (mine === asked) {
      folders.replaceChildren(...up, ...below);
      if (focus) {
        folders.querySelector('button')?.focus();
      }
    }
  }

  show(path);
  return ask({
    title,
    accept,
    body: [...(only ? [] : [field('Connection', choice)]), place, folders],
    submit: () => ({ connection: choice.value, path: here }),
  });
}
