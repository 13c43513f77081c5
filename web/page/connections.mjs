/** The connections and their state, and which of them is open. */
import { get, post } from './api.mjs';
import { addConnection, connectWith } from './connect.mjs';
import { ask, paragraph } from './dialogs.mjs';
import { announce, byId, element, icon } from './dom.mjs';
import { attempt } from './notices.mjs';

const states = {
  connected: 'Connected', disconnected: 'Disconnected', unavailable: 'Not available' };

const patience = 20;
const pause = 250;  // milliseconds

const gone = { disconnected: 'disconnected', unavailable: 'not available' };

export class Connections {
  #all = [];
  #open = null;
  #go;

  /** go(id) opens a connection. */
  constructor(go) {
    this.#go = go;
    byId('add-connection').onclick = () => this.add();
    byId('connect').onclick = () => this.connect();
    byId('disconnect').onclick = () => this.disconnect();
    for (const id of ['forget', 'forget-connected']) {
      byId(id).onclick = () => this.forget();
    }
  }

  get all() { return this.#all; }
  find(id) { return this.#all.find((one) => one.id === id) ?? null; }

  async load() {
    const { user, connections } = await get('connections');
    byId('user').textContent = user;
    this.#all = connections;
    this.show(this.#open?.id ?? null);
  }

  /** Shows which one is open; null for none. */
  show(id) {
    this.#open = this.find(id);
    byId('connections').replaceChildren(...this.#all.map((one) => this.#item(one)));
    byId('no-connections').hidden = this.#all.length > 0;
    document.body.dataset.view = this.#open?.state ?? 'connections';
    byId('gone-title').textContent = this.#open ? `“${this.#open.alias}” is ${gone[this.#open.state]}` : '';
    byId('gone-advice').textContent = this.#open?.state === 'unavailable'
      ? 'Its service refuses it now. Delete the connection and sign in to the account anew.'
      : 'Connect it to see its files.';
    byId('connect').hidden = this.#open?.state === 'unavailable';
  }

  async add() {
    const added = await attempt('Add a connection', addConnection);
    if (added) {
      await this.#reloadAndGo(added.connection, true);
    }
  }

  async connect() {
    const { id, alias } = this.#open;
    announce(`Connecting ${alias}`);
    byId('connect').disabled = true;
    const done = await attempt(`Connect “${alias}”`,
      () => connectWith('connect', { connection: id }, { askPassword: true }));
    byId('connect').disabled = false;
    if (done) {
      await this.#reloadAndGo(id, true);
    }
  }

  async disconnect() {
    const { id, alias } = this.#open;
    await attempt(`Disconnect “${alias}”`, async () => {
      await post('disconnect', { connection: id });
      await this.#reloadAndGo(id);
      byId('connect').focus();
    });
  }

  async forget() {
    const { id, alias } = this.#open;
    const sure = await ask({
      title: `Delete the connection “${alias}”?`,
      body: [paragraph('What it leads to stays where it is. To get there again, add the connection anew.')],
      accept: 'Delete', danger: true,
    });
    if (sure) {
      await attempt(`Delete “${alias}”`, async () => {
        await post('forget', { connection: id });
        await this.#reloadAndGo(null);
      });
    }
  }

  /** With `made` the connection is there, but the box may take a moment to see its folder. */
  async #reloadAndGo(id, made = false) {
    for (let tries = made ? patience : 1; tries > 0; tries -= 1) {
      await attempt('Connections', () => this.load());
      if (!made || this.find(id)?.state === 'connected') {
        break;
      }
      await new Promise((resolve) => { setTimeout(resolve, pause); });
    }
    this.#go(id);
  }

  #item(one) {
    const open = this.#open?.id === one.id;
    return element('li', {}, element('button', {
      type: 'button', 'aria-current': open && 'true', title: one.uri ?? one.id,
      onclick: () => this.#go(one.id),
    }, icon(one.cloud ? 'cloud' : 'server'),
    element('span', { className: 'alias', textContent: one.alias || one.id }),
    element('span', { className: `state ${one.state}`, textContent: `${one.protocol_name} · ${states[one.state]}` })));
  }
}
