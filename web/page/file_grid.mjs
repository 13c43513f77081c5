/** The entries of one folder as a grid: sorted, chosen, walked by keyboard, of any length. */
import { element, icon } from './dom.mjs';
import { date, size } from './format.mjs';
import { Selection } from './selection.mjs';
import { sorted } from './sort.mjs';
import { VirtualList } from './virtual_list.mjs';

const columns = [['name', 'Name'], ['size', 'Size'], ['modified', 'Changed']];
const patience = 800;  // milliseconds between the letters of a name that is typed

export class FileGrid {
  #grid;
  #list;
  #entries = [];
  #shown = [];
  #selection = new Selection();
  #rows = new WeakMap();
  #active = -1;
  #key = 'name';
  #descending = false;
  #typed = { text: '', at: 0 };
  #actions;
  #all;
  #heads = [];

  /** actions: open(entry), up(), rename(), remove(), changed() after each change of what is chosen. */
  constructor(grid, actions) {
    this.#grid = grid;
    this.#actions = actions;
    const head = this.#makeHead();
    const body = element('div', { role: 'rowgroup', className: 'rows' });
    grid.append(head, body);
    this.#list = new VirtualList(grid, body, (index) => this.#row(index), head);
    grid.addEventListener('keydown', (event) => this.#keyDown(event));
    grid.addEventListener('focus', () => this.#activate(Math.max(0, this.#active)));
    body.addEventListener('click', (event) => this.#click(event));
    body.addEventListener('dblclick', (event) => this.#doubleClick(event));
  }

  /** With `keep` the folder is the same one: what was chosen stays, and so does the place. */
  show(entries, keep) {
    this.#entries = entries;
    if (!keep) {
      this.#selection = new Selection();
      this.#active = -1;
      this.#list.toTop();
    }
    this.#sort();
  }

  get chosen() { return this.#shown.filter((entry) => this.#selection.has(entry.name)); }
  get isAllChosen() { return this.#selection.isAll; }

  focus(name = null) {
    const index = this.#shown.findIndex((entry) => entry.name === name);
    this.#grid.focus();
    this.#activate(Math.max(0, index));
  }

  #makeHead() {
    this.#all = element('input', {
      type: 'checkbox', 'aria-label': 'Choose all', onchange: () => this.#chooseAll(this.#all.checked) });
    this.#heads = columns.map(([key, text]) => element('span',
      { role: 'columnheader', className: key, 'aria-sort': 'none' },
      element('button', { type: 'button', textContent: text, onclick: () => this.#sortBy(key) })));
    return element('div', { role: 'rowgroup', className: 'head' },
      element('div', { role: 'row', 'aria-rowindex': '1' },
        element('span', { role: 'columnheader', className: 'check' }, this.#all), ...this.#heads));
  }

  #sortBy(key) {
    this.#descending = key === this.#key && !this.#descending;
    this.#key = key;
    this.#sort();
  }

  #sort() {
    const active = this.#shown[this.#active]?.name;
    this.#shown = sorted(this.#entries, this.#key, this.#descending);
    this.#selection.setOrder(this.#shown.map((entry) => entry.name));
    this.#active = this.#shown.findIndex((entry) => entry.name === active);
    columns.forEach(([key], at) => this.#heads[at].setAttribute('aria-sort',
      key !== this.#key ? 'none' : this.#descending ? 'descending' : 'ascending'));
    this.#grid.setAttribute('aria-rowcount', this.#shown.length + 1);
    this.#list.setCount(this.#shown.length);
    this.#activate(this.#active);
    this.#chosenChanged();
  }

  #row(index) {
    const entry = this.#shown[index];
    let row = this.#rows.get(entry);
    if (!row) {
      row = this.#makeRow(entry);
      this.#rows.set(entry, row);
    }
    const chosen = this.#selection.has(entry.name);
    row.index = index;
    row.id = `entry-${index}`;
    row.setAttribute('aria-rowindex', index + 2);
    row.setAttribute('aria-selected', chosen);
    row.classList.toggle('active', index === this.#active);
    row.querySelector('input').checked = chosen;
    return row;
  }

  #makeRow(entry) {
    const kind = entry.folder ? 'folder' : entry.exports ? 'document' : 'file';
    const name = entry.folder
      ? element('button', { type: 'button', tabIndex: -1, className: 'open', textContent: entry.name })
      : element('span', { textContent: entry.name });
    name.title = entry.name;
    return element('div', { role: 'row' },
      element('span', { role: 'gridcell', className: 'check' }, element('input', {
        type: 'checkbox', tabIndex: -1, 'aria-label': `Choose ${entry.name}` })),
      element('span', { role: 'gridcell', className: 'name' }, icon(kind), name),
      element('span', {
        role: 'gridcell', className: 'size', textContent: entry.folder ? '' : size(entry.size) }),
      element('span', { role: 'gridcell', className: 'modified', textContent: date(entry.modified) }));
  }

  #activate(index) {
    this.#active = index < this.#shown.length ? index : this.#shown.length - 1;
    this.#list.show(this.#active);
    if (this.#active >= 0) {
      this.#grid.setAttribute('aria-activedescendant', `entry-${this.#active}`);
    } else {
      this.#grid.removeAttribute('aria-activedescendant');
    }
  }

  #chosenChanged() {
    this.#list.draw();
    this.#all.checked = this.#selection.isAll;
    this.#all.indeterminate = this.#selection.size > 0 && !this.#selection.isAll;
    this.#actions.changed();
  }

  #chooseAll(all) {
    if (all) {
      this.#selection.all();
    } else {
      this.#selection.clear();
    }
    this.#chosenChanged();
  }

  #click(event) {
    const row = event.target.closest('[role=row]');
    if (!row) {
      return;
    }
    const { index } = row;
    if (event.target.closest('.open') && !event.ctrlKey && !event.shiftKey) {
      this.#actions.open(this.#shown[index]);
      return;
    }
    if (event.shiftKey) {
      this.#selection.extend(index);
    } else if (event.ctrlKey || event.metaKey || event.target.closest('.check')) {
      this.#selection.toggle(index);
    } else {
      this.#selection.only(index);
    }
    this.#grid.focus();
    this.#activate(index);
    this.#chosenChanged();
  }

  #doubleClick(event) {
    const row = event.target.closest('[role=row]');
    if (row && !event.target.closest('.check, .open')) {
      this.#actions.open(this.#shown[row.index]);
    }
  }

  #keyDown(event) {
    if (event.target !== this.#grid || event.altKey) {
      return;
    }
    const command = event.ctrlKey || event.metaKey;
    if (this.#moveBy(event.key, event.shiftKey, command) || this.#act(event.key, command) ||
        (!command && this.#findByLetter(event))) {
      event.preventDefault();
    }
  }

  /** False for a key that does not lead to another row. */
  #moveBy(key, extend, command) {
    const last = this.#shown.length - 1;
    const page = this.#list.rowsPerView;
    const to = {
      ArrowDown: this.#active + 1, ArrowUp: this.#active - 1, Home: 0, End: last,
      PageDown: this.#active + page, PageUp: this.#active - page,
    }[key];
    if (to === undefined || last < 0) {
      return false;
    }
    const index = Math.max(0, Math.min(last, to));
    this.#activate(index);
    if (extend) {
      this.#selection.extend(index);
    } else if (!command) {
      this.#selection.only(index);
    }
    this.#chosenChanged();
    return true;
  }

  #act(key, command) {
    const entry = this.#shown[this.#active];
    const act = {
      Enter: () => entry && this.#actions.open(entry),
      ' ': () => entry && this.#toggleActive(),
      F2: () => this.#actions.rename(),
      Delete: () => this.#actions.remove(),
      Backspace: () => this.#actions.up(),
      Escape: () => this.#chooseAll(false),
      a: command ? () => this.#chooseAll(true) : undefined,
    }[key];
    act?.();
    return act !== undefined;
  }

  #toggleActive() {
    this.#selection.toggle(this.#active);
    this.#chosenChanged();
  }

  #findByLetter({ key, timeStamp }) {
    if (key.length !== 1) {
      return false;
    }
    const text = timeStamp - this.#typed.at < patience ? this.#typed.text + key : key;
    this.#typed = { text, at: timeStamp };
    const found = this.#shown.findIndex(
      (entry) => entry.name.toLowerCase().startsWith(text.toLowerCase()));
    if (found >= 0) {
      this.#activate(found);
      this.#selection.only(found);
      this.#chosenChanged();
    }
    return true;
  }
}
