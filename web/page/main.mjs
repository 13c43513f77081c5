/** Starts the page and leads from place to place: the address says which folder is open. */
import { Connections } from './connections.mjs';
import { byId } from './dom.mjs';
import { Files } from './files.mjs';
import { attempt, showFailure } from './notices.mjs';
import { fromFragment, toFragment } from './paths.mjs';
import { setConnections } from './place.mjs';
import { Tasks } from './tasks.mjs';
import { Uploads } from './uploads.mjs';

const connections = new Connections((id) => go(id, '/'));
const files = new Files((path) => go(files.connection.id, path), () => tasks.look());
const uploads = new Uploads(files);
const tasks = new Tasks(() => isBrowsing() && files.load(true));
setConnections(() => connections.all);

function isBrowsing() {
  return document.body.dataset.view === 'connected';
}

function go(id, path) {
  const fragment = id === null ? '#' : toFragment(id, path);
  if (fragment === location.hash || (fragment === '#' && location.hash === '')) {
    open();
  } else {
    location.hash = fragment;
  }
}

async function open() {
  const { connection: id, path } = fromFragment(location.hash);
  const connection = connections.find(id);
  connections.show(id);
  if (id !== null && connection === null) {
    showFailure('Open', new Error('There is no such connection any more.'));
  } else if (isBrowsing()) {
    await files.open(connection, path);
  }
}

function takeDrops() {
  const target = byId('files');
  let inside = 0;
  const mark = (change) => {
    inside = change === 0 ? 0 : inside + change;
    target.classList.toggle('dropping', inside > 0 && isBrowsing());
  };
  target.addEventListener('dragenter', () => mark(1));
  target.addEventListener('dragleave', () => mark(-1));
  // A file that is dropped beside the list must not take the page's place.
  window.addEventListener('dragover', (event) => event.preventDefault());
  window.addEventListener('drop', (event) => {
    event.preventDefault();
    mark(0);
    if (isBrowsing() && target.contains(event.target)) {
      attempt('Upload', () => uploads.drop(event.dataTransfer));
    }
  });
}

async function start() {
  takeDrops();
  byId('back').onclick = () => go(null);
  window.addEventListener('hashchange', open);
  try {
    await connections.load();
  } catch (error) {
    byId('files').hidden = true;
    showFailure('Connections', error, () => location.reload());
    return;
  } finally {
    document.body.removeAttribute('aria-busy');
  }
  await open();
  await tasks.look();
}

start();
