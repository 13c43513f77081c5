/** Copies in the background: they go on when the page is closed, and are found again. */
import { get, post } from './api.mjs';
import { byId, element } from './dom.mjs';
import { count, percent, rate, size, timeLeft } from './format.mjs';
import { attempt } from './notices.mjs';

const every = 1000;  // milliseconds

export class Tasks {
  #rows = new Map();
  #alive = new Set();
  #timer = null;
  #ended;

  /** ended() is called when a copy has come to its end. */
  constructor(ended) {
    this.#ended = ended;
    document.addEventListener('visibilitychange', () => !document.hidden && this.look());
  }

  /** Now, and again as long as something runs and somebody looks. */
  async look() {
    clearTimeout(this.#timer);
    let tasks;
    try {
      ({ tasks } = await get('tasks'));
    } catch {
      this.#lookLater();
      return;
    }
    this.#show(tasks);
    if (tasks.some(isAlive)) {
      this.#lookLater();
    }
  }

  #lookLater() {
    this.#timer = document.hidden ? null : setTimeout(() => this.look(), every);
  }

  #show(tasks) {
    byId('transfers').classList.toggle('has-copies', tasks.length > 0);
    const ids = new Set(tasks.map(({ id }) => id));
    for (const [id, row] of this.#rows) {
      if (!ids.has(id)) {
        row.remove();
        this.#rows.delete(id);
      }
    }
    for (const task of tasks) {
      if (!this.#rows.has(task.id)) {
        this.#rows.set(task.id, this.#makeRow(task));
        byId('copies').append(this.#rows.get(task.id));
      }
      this.#rows.get(task.id).show(task);
      if (this.#alive.has(task.id) && !isAlive(task)) {
        this.#ended();
      }
      this.#alive[isAlive(task) ? 'add' : 'delete'](task.id);
    }
  }

  #makeRow({ id, title }) {
    const bar = element('progress', { max: 100, 'aria-label': title });
    const text = element('p', { className: 'detail', role: 'status' });
    const button = (label, action) => element('button', {
      type: 'button', textContent: label, 'aria-label': `${label}: ${title}`,
      onclick: () => attempt(label, async () => {
        await post(action, { id });
        await this.look();
      }) });
    const cancel = button('Cancel', 'tasks/cancel');
    const remove = button('Dismiss', 'tasks/remove');
    const row = element('li', { className: 'transfer' },
      element('span', { className: 'title', textContent: title, title }),
      element('span', { className: 'buttons' }, cancel, remove), bar, text);
    row.show = (task) => {
      row.dataset.state = task.state;
      const alive = isAlive(task);
      if (alive && (task.counting || !task.total)) {
        bar.removeAttribute('value');
      } else {
        bar.value = task.state === 'done' ? 100 : percent(task.done, task.total);
      }
      bar.hidden = task.state === 'failed' || task.state === 'cancelled';
      cancel.hidden = !alive;
      remove.hidden = alive;
      text.textContent = detail(task);
    };
    return row;
  }
}

function isAlive({ state }) {
  return state === 'waiting' || state === 'running';
}

function detail(task) {
  const files = task.files_total
    ? `${task.files_done} of ${count(task.files_total, 'file')}` : '';
  switch (task.state) {
    case 'done': return ['Done', files, size(task.total ?? task.done)].filter(Boolean).join(' · ');
    case 'waiting': return 'Waiting for its turn';
    case 'cancelled': return ['Cancelled', files].filter(Boolean).join(' · ');
    case 'failed': return [task.error?.meaning ?? task.error ?? 'The copy failed.',
      task.error?.advice].filter(Boolean).join(' ');
    default: return [files, task.total ? `${size(task.done)} of ${size(task.total)}` : '',
      task.counting ? 'counting what there is' : '', rate(task.rate),
      !task.counting && task.rate > 0 ? timeLeft((task.total - task.done) / task.rate) : '']
      .filter(Boolean).join(' · ');
  }
}
