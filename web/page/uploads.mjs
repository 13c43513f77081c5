/** Uploads: from the files that were chosen or dropped to the rows that tell how far they are. */
import { post, sentences, upload } from './api.mjs';
import { ask, paragraph } from './dialogs.mjs';
import { announce, byId, element, oncePerFrame } from './dom.mjs';
import { FolderMaker } from './folder_maker.mjs';
import { count, percent, rate, size, timeLeft } from './format.mjs';
import { isWithin, join, parentOf } from './paths.mjs';
import { Queue } from './queue.mjs';
import { VirtualList } from './virtual_list.mjs';
import { fromInput, topNames, walk } from './walk.mjs';

const refreshEvery = 3000;  // milliseconds

export class Uploads {
  #files;
  #folders = new FolderMaker((connection, path) => post('mkdir', { connection, path }));
  #queue;
  #list;
  #rows = new WeakMap();
  #refreshing = null;

  constructor(files) {
    this.#files = files;
    const showSoon = oncePerFrame(() => this.#show());
    this.#queue = new Queue((item, report) => this.#start(item, report), showSoon);
    this.#list = new VirtualList(byId('uploads'), byId('uploads-rows'), (index) => this.#row(index));
    byId('cancel-uploads').onclick = () => this.#queue.cancelAll();
    byId('clear-uploads').onclick = () => this.#queue.clearDone();
    byId('retry-uploads').onclick = () => this.#queue.retryAll();
    for (const id of ['choose-files', 'choose-folder']) {
      const input = byId(`${id}-input`);
      byId(id).onclick = () => input.click();
      input.onchange = () => {
        const found = fromInput(input.files);
        input.value = '';
        this.#add(found);
      };
    }
    window.addEventListener('beforeunload', (event) => {
      if (this.#queue.isBusy) {
        event.preventDefault();
      }
    });
  }

  /** What was dropped; has to be called while the drop is being handled. */
  async drop(transfer) {
    const entries = [...transfer.items]
      .map((item) => item.webkitGetAsEntry?.()).filter(Boolean);
    const found = entries.length > 0 ? await this.#countAll(entries) : fromInput(transfer.files);
    if (found) {
      await this.#add(found);
    }
  }

  /** Everything in the folders that were dropped; null when the person has had enough. */
  async #countAll(entries) {
    const stop = new AbortController();
    const text = paragraph('');
    text.setAttribute('role', 'status');
    let failure = null;
    const closed = ask({
      title: 'Counting what was dropped', body: [text], accept: null, close: 'Stop' });
    const dialog = text.closest('dialog');
    let sum = { files: 0, folders: 0, bytes: 0 };
    const tell = oncePerFrame(() => {
      text.textContent = `${count(sum.files, 'file')} in ${count(sum.folders, 'folder')}, ` +
        size(sum.bytes);
    });
    // A browser that is busy reading a folder does not keep the person waiting.
    const stopped = closed.then(() => stop.abort());
    const walked = walk(entries, (counted) => {
      sum = counted;
      tell();
    }, stop.signal).catch((error) => {
      failure = error;
      return null;
    });
    const found = await Promise.race([walked, stopped.then(() => null)]);
    dialog.close();
    if (failure && failure.name !== 'AbortError') {
      await ask({
        title: 'The folder cannot be read',
        body: [paragraph('The browser may not read all that was dropped. Nothing was uploaded.')],
        accept: null, close: 'Close' });
    }
    return found;
  }

  async #add(found) {
    const connection = this.#files.connection.id;
    const folder = this.#files.path;
    const there = this.#files.names;
    const taken = topNames(found).filter((name) => there.has(name));
    const choice = taken.length > 0 ? await this.#askTaken(taken) : 'replace';
    if (choice === null) {
      return;
    }
    const skipped = new Set(choice === 'skip' ? taken : []);
    const items = found.filter(({ path }) => !skipped.has(path.split('/')[1]))
      .map(({ path, file = null, size: bytes }) => (
        { connection, folder, path: join(folder, path.slice(1)), file, size: bytes }));
    this.#folders.forget();
    this.#queue.add(items);
    announce(`${count(items.length, 'upload')} in the queue`);
  }

  #askTaken(taken) {
    const some = taken.slice(0, 5).map((name) => `“${name}”`).join(', ');
    return ask({
      title: taken.length === 1 ? 'This name is taken' : 'Names are taken',
      body: [paragraph(`${some}${taken.length > 5 ? ` and ${taken.length - 5} more` : ''}: ` +
        'there already. Files of the same names are replaced, also in folders.')],
      choices: [['Skip these', 'skip']],
      accept: 'Replace',
      submit: (value) => (value === 'skip' ? 'skip' : 'replace'),
    });
  }

  #start(item, report) {
    let transfer = null;
    let stopped = false;
    const id = crypto.randomUUID?.() ?? `upload-${Math.random().toString(36).slice(2).padEnd(16, '0')}`;
    const run = async () => {
      await this.#folders.make(item.connection, item.file ? parentOf(item.path) : item.path,
        item.folder);
      if (stopped) {
        throw new DOMException('Stopped', 'AbortError');
      }
      if (item.file) {
        transfer = upload({ connection: item.connection, path: item.path, size: item.size, id },
          item.file, report);
        await transfer.done;
      }
      this.#arrived(item);
    };
    return {
      done: run(),
      cancel: () => {
        stopped = true;
        transfer?.cancel();
        if (transfer) {
          post('cancel', { id }).catch(() => {});
        }
      },
    };
  }

  /** The open folder shows what has come, but is not asked for after each of thousands. */
  #arrived(item) {
    const { connection, path } = this.#files;
    if (this.#refreshing === null && connection?.id === item.connection &&
        isWithin(item.path, path)) {
      this.#refreshing = setTimeout(() => {
        this.#refreshing = null;
        this.#files.load(true);
      }, this.#queue.totals.files > 3 ? refreshEvery : 0);
    }
  }

  #show() {
    const totals = this.#queue.totals;
    const { isBusy } = this.#queue;
    byId('transfers').classList.toggle('has-uploads', totals.files > 0);
    byId('uploads').style.setProperty('--many', Math.min(totals.files, 4));
    byId('uploads-bar').value = percent(totals.sent, totals.total);
    byId('uploads-bar').hidden = !isBusy;
    const parts = [`${totals.done.toLocaleString('en')} of ${count(totals.files, 'upload')} done`];
    if (totals.failed) {
      parts.push(`${totals.failed.toLocaleString('en')} failed`);
    }
    if (isBusy) {
      parts.push(`${size(totals.sent)} of ${size(totals.total)}`, rate(totals.rate),
        timeLeft(totals.left));
    }
    byId('uploads-sum').textContent = parts.filter(Boolean).join(' · ');
    byId('cancel-uploads').hidden = !isBusy;
    byId('clear-uploads').hidden = totals.done === 0;
    byId('retry-uploads').hidden = totals.failed < 2;
    this.items = this.#queue.items;
    this.#list.setCount(this.items.length);
  }

  #row(index) {
    const item = this.items[index];
    let row = this.#rows.get(item);
    if (!row) {
      row = this.#makeRow(item);
      this.#rows.set(item, row);
    }
    row.setAttribute('aria-posinset', index + 1);
    row.setAttribute('aria-setsize', this.items.length);
    row.show();
    return row;
  }

  #makeRow(item) {
    const name = item.path.slice(1);
    const bar = element('progress', { max: 100, 'aria-label': `Upload of ${name}` });
    const text = element('p', { className: 'detail' });
    const button = (label, action) => element('button', {
      type: 'button', textContent: label, 'aria-label': `${label}: ${name}`, onclick: action });
    const cancel = button('Cancel', () => this.#queue.cancel(item));
    const retry = button('Try again', () => this.#queue.retry(item));
    const dismiss = button('Dismiss', () => this.#queue.dismiss(item));
    const row = element('div', { role: 'listitem', className: 'transfer' },
      element('span', { className: 'title', textContent: name, title: name }),
      element('span', { className: 'buttons' }, retry, cancel, dismiss), bar, text);
    row.show = () => {
      row.dataset.state = item.state;
      bar.value = percent(item.sent, item.size);
      bar.hidden = item.state === 'failed' || item.state === 'done';
      cancel.hidden = item.state !== 'running' && item.state !== 'waiting';
      retry.hidden = item.state !== 'failed';
      dismiss.hidden = item.state !== 'failed' && item.state !== 'done';
      text.textContent = this.#detail(item);
      text.title = item.error ? text.textContent : '';
    };
    return row;
  }

  #detail(item) {
    const now = performance.now();
    switch (item.state) {
      case 'waiting': return `Waiting · ${size(item.size)}`;
      case 'done': return `Done · ${size(item.size)}`;
      case 'failed': return sentences(item.error);
      default: return [`${size(item.sent)} of ${size(item.size)}`,
        item.sent >= item.size ? 'the service is storing it' : rate(item.rate.perSecond(now)),
        timeLeft(item.sent >= item.size ? NaN : item.rate.secondsLeft(now, item.size))]
        .filter(Boolean).join(' · ');
    }
  }
}
