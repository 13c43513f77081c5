/** The folder that is open: what is in it, and what can be done with it. */
import { get, post } from './api.mjs';
import { askName, ask, paragraph } from './dialogs.mjs';
import { announce, byId, element } from './dom.mjs';
import { download } from './download.mjs';
import { FileGrid } from './file_grid.mjs';
import { count } from './format.mjs';
import { attempt, showFailure } from './notices.mjs';
import { crumbs, join, nameOf, parentOf, whatIsWrong } from './paths.mjs';
import { askPlace } from './place.mjs';

/** go(path) leads to another folder; copied() is called when a copy has begun. */
export class Files {
  #connection = null;
  #path = '/';
  #entries = [];
  #grid;
  #loading = null;
  #go;
  #copied;
  #buttons;

  constructor(go, copied) {
    this.#go = go;
    this.#copied = copied;
    this.#grid = new FileGrid(byId('grid'), {
      open: (entry) => this.#open(entry),
      up: () => this.#path !== '/' && go(parentOf(this.#path)),
      rename: () => this.#grid.chosen.length === 1 && this.rename(),
      remove: () => this.#grid.chosen.length > 0 && this.remove(),
      changed: () => this.#showButtons(),
    });
    this.#buttons = {
      'new-folder': () => this.makeFolder(),
      refresh: () => this.load(true),
      download: () => this.download(),
      rename: () => this.rename(),
      move: () => this.move(),
      copy: () => this.copy(),
      delete: () => this.remove(),
    };
    for (const [id, action] of Object.entries(this.#buttons)) {
      byId(id).addEventListener('click', action);
    }
  }

  get connection() { return this.#connection; }
  get path() { return this.#path; }
  get names() { return new Set(this.#entries.map((entry) => entry.name)); }

  async open(connection, path) {
    const from = this.#connection?.id === connection.id ? this.#path : null;
    this.#connection = connection;
    this.#path = path;
    this.#showCrumbs();
    await this.load(false);
    // Back in the folder above, the one that was left is where the eye is.
    this.#grid.focus(from !== null && parentOf(from) === path ? nameOf(from) : null);
  }

  /** Anew from the box; with `keep` the same folder. Only the last one asked for is shown. */
  async load(keep) {
    this.#loading?.abort();
    const loading = new AbortController();
    this.#loading = loading;
    byId('files').setAttribute('aria-busy', 'true');
    if (!keep) {
      this.#show([], false, 'Loading…');
    }
    try {
      const answer = await get('list',
        { connection: this.#connection.id, path: this.#path }, loading.signal);
      this.#show(answer.entries, keep, answer.entries.length ? ''
        : 'This folder is empty. Drop files here, or choose Upload files.');
      this.#tellCount(answer);
    } catch (error) {
      if (error.name !== 'AbortError') {
        this.#show([], false, 'The folder could not be opened.');
        showFailure('Open', error, () => this.load(false));
      }
    } finally {
      if (this.#loading === loading) {
        byId('files').removeAttribute('aria-busy');
      }
    }
  }

  makeFolder() {
    return this.#askName({
      title: 'New folder', label: 'Name', accept: 'Create', value: '',
      submit: (name) => post('mkdir', this.#at(name)),
    });
  }

  rename() {
    const [entry] = this.#grid.chosen;
    return this.#askName({
      title: `Rename “${entry.name}”`, label: 'New name', accept: 'Rename', value: entry.name,
      submit: (name) => post('rename', { ...this.#at(entry.name), name }),
    });
  }

  async remove() {
    const chosen = this.#grid.chosen;
    const what = chosen.length === 1 ? `“${chosen[0].name}”` : count(chosen.length, 'item');
    const sure = await ask({
      title: `Delete ${what}?`,
      body: [paragraph(chosen.some((entry) => entry.folder)
        ? 'Folders are deleted with everything in them. This cannot be undone.'
        : 'This cannot be undone.')],
      accept: 'Delete', danger: true,
    });
    if (sure) {
      await this.#each(chosen, 'Delete', (entry) => post('delete',
        { ...this.#at(entry.name), recursive: entry.folder }));
    }
  }

  async move() {
    const chosen = this.#grid.chosen;
    const to = await askPlace({
      title: `Move ${this.#what(chosen)}`, accept: 'Move here', only: this.#connection,
      path: this.#path });
    if (to) {
      await this.#each(chosen, 'Move', (entry) => post('move',
        { ...this.#at(entry.name), folder: to.path }));
    }
  }

  async copy() {
    const chosen = this.#grid.chosen;
    const to = await askPlace({
      title: `Copy ${this.#what(chosen)}`, accept: 'Copy here', from: this.#connection, path: '/' });
    if (to) {
      const paths = chosen.map((entry) => join(this.#path, entry.name));
      await attempt('Copy', async () => {
        await post('copy', { from: { connection: this.#connection.id, paths }, to });
        this.#copied();
      });
    }
  }

  download() {
    const whole = this.#grid.isAllChosen && this.#grid.chosen.length > 1 && this.#path !== '/';
    return attempt('Download', () => download(this.#connection.id, this.#path,
      whole ? null : this.#grid.chosen));
  }

  #open(entry) {
    if (entry.folder) {
      this.#go(join(this.#path, entry.name));
    } else {
      attempt('Download', () => download(this.#connection.id, this.#path, [entry]));
    }
  }

  #at(name) { return { connection: this.#connection.id, path: join(this.#path, name) }; }
  #what(chosen) { return chosen.length === 1 ? `“${chosen[0].name}”` : count(chosen.length, 'item'); }

  async #askName(question) {
    let named = null;
    const done = await askName({
      ...question,
      check: whatIsWrong,
      submit: (name) => {
        named = name;
        return question.submit(name);
      },
    });
    if (done) {
      await this.load(true);
      this.#grid.focus(named);
    }
  }

  /** One after the other; what fails is told and does not keep the others. */
  async #each(chosen, title, action) {
    for (const [at, entry] of chosen.entries()) {
      announce(`${title}: ${at + 1} of ${chosen.length}`);
      await attempt(`${title} “${entry.name}”`, () => action(entry));
    }
    await this.load(true);
    this.#grid.focus();
  }

  #show(entries, keep, hint) {
    this.#entries = entries;
    this.#grid.show(entries, keep);
    byId('hint').textContent = hint;
    byId('hint').hidden = !hint;
  }

  #tellCount({ entries, left_out: leftOut }) {
    const left = leftOut ? `, and ${count(leftOut, 'more that is', 'more that are')} not shown` : '';
    const text = `${count(entries.length, 'item')}${left}`;
    byId('count').textContent = text;
    announce(`${nameOf(this.#path) || this.#connection.alias}: ${text}`);
  }

  #showCrumbs() {
    const all = crumbs(this.#path);
    byId('crumbs').replaceChildren(...all.map(({ name, path }, at) => element('li', {},
      at === all.length - 1
        ? element('span', { 'aria-current': 'page', textContent: name || this.#connection.alias })
        : element('button', {
          type: 'button', textContent: name || this.#connection.alias, onclick: () => this.#go(path) }))));
    document.title = `${nameOf(this.#path) || this.#connection.alias} – Files`;
  }

  #showButtons() {
    const many = this.#grid.chosen.length;
    for (const id of ['download', 'move', 'copy', 'delete']) {
      byId(id).disabled = many === 0;
    }
    byId('rename').disabled = many !== 1;
    byId('tools').classList.toggle('for-chosen', many > 0);
    byId('chosen').textContent = many ? `${count(many, 'item')} chosen` : '';
  }
}
