/**
 * Uploads that take turns. An item is {path, size, ...}; the queue adds "state" (waiting, running,
 * done, failed, cancelled), "sent" and, for a failure, "error". How an item travels is handed in:
 * start(item, report) gives {done: promise, cancel()}, and calls report(bytes) as they go.
 */
import { Rate } from './rate.mjs';

export class Queue {
  #start;
  #changed;
  #now;
  #parallel;
  #byState = { waiting: new Set(), running: new Set(), failed: new Set(), done: new Set() };
  #running = new Map();
  #rate = new Rate();
  #bytes = { total: 0, finished: 0, flying: 0 };

  constructor(start, changed, { parallel = 2, now = () => performance.now() } = {}) {
    this.#start = start;
    this.#changed = changed;
    this.#parallel = parallel;
    this.#now = now;
  }

  add(items) {
    for (const item of items) {
      item.sent = 0;
      this.#bytes.total += item.size;
      this.#move(item, 'waiting');
    }
    this.#fill();
  }

  cancel(item) {
    if (item.state === 'waiting') {
      this.#forget(item);
    } else if (item.state === 'running') {
      this.#running.get(item).cancel();
    }
    this.#changed();
  }

  cancelAll() {
    for (const item of [...this.#byState.waiting]) {
      this.#forget(item);
    }
    for (const transfer of [...this.#running.values()]) {
      transfer.cancel();
    }
    this.#changed();
  }

  retry(item) {
    if (item.state === 'failed') {
      item.error = undefined;
      item.sent = 0;
      this.#move(item, 'waiting');
      this.#fill();
    }
  }

  retryAll() {
    [...this.#byState.failed].forEach((item) => this.retry(item));
  }

  dismiss(item) {
    if (item.state === 'failed') {
      this.#forget(item);
    } else if (item.state === 'done') {
      this.#clear(item);
    }
    this.#changed();
  }

  /** Takes away what is done; with nothing left to do the count begins anew. */
  clearDone() {
    for (const item of [...this.#byState.done]) {
      this.#clear(item);
    }
    this.#changed();
  }

  /** What needs attention first: failures, what runs, what waits, what is done. */
  get items() {
    const { failed, running, waiting, done } = this.#byState;
    return [...failed, ...running, ...waiting, ...done];
  }

  get isBusy() { return this.#byState.running.size + this.#byState.waiting.size > 0; }

  get totals() {
    const { failed, running, waiting, done } = this.#byState;
    const now = this.#now();
    const failing = [...failed].reduce((sum, item) => sum + item.size, 0);
    const total = this.#bytes.total - failing;
    const sent = this.#bytes.finished + this.#bytes.flying;
    return {
      failed: failed.size,
      done: done.size,
      files: running.size + waiting.size + done.size + failed.size,
      total,
      sent,
      rate: this.isBusy ? this.#rate.perSecond(now) : 0,
      left: this.isBusy ? this.#rate.secondsLeft(now, total) : NaN,
    };
  }

  #move(item, state) {
    this.#byState[item.state]?.delete(item);
    item.state = state;
    this.#byState[state]?.add(item);
  }

  #clear(item) {
    this.#move(item, 'gone');
    this.#bytes.total -= item.size;
    this.#bytes.finished -= item.size;
  }

  #forget(item) {
    this.#move(item, 'cancelled');
    this.#bytes.total -= item.size;
  }

  #fill() {
    while (this.#running.size < this.#parallel && this.#byState.waiting.size > 0) {
      const [item] = this.#byState.waiting;
      this.#run(item);
    }
    this.#changed();
  }

  async #run(item) {
    this.#move(item, 'running');
    item.rate = new Rate();
    this.#report(item, 0);
    const transfer = this.#start(item, (bytes) => this.#report(item, bytes));
    this.#running.set(item, transfer);
    let error;
    try {
      await transfer.done;
    } catch (caught) {
      error = caught;
    }
    this.#running.delete(item);
    this.#bytes.flying -= item.sent;
    this.#end(item, error);
    this.#fill();
  }

  #end(item, error) {
    if (error === undefined) {
      item.sent = item.size;
      this.#bytes.finished += item.size;
      this.#move(item, 'done');
    } else if (error.name === 'AbortError') {
      this.#forget(item);
    } else {
      item.error = error;
      item.sent = 0;
      this.#move(item, 'failed');
    }
  }

  #report(item, bytes) {
    if (item.state !== 'running') {
      return;
    }
    const sent = Math.min(bytes, item.size);
    this.#bytes.flying += sent - item.sent;
    item.sent = sent;
    item.rate.add(this.#now(), sent);
    this.#rate.add(this.#now(), this.#bytes.finished + this.#bytes.flying);
    this.#changed();
  }
}
