import assert from 'node:assert/strict';
import test from 'node:test';
import { fromInput, topNames, walk } from '../../web/page/walk.mjs';

/** Entries as a browser hands them out: a hundred at a time, and only once by each reader. */
function file(fullPath, size = 1) {
  return { isDirectory: false, fullPath, file: (good) => queueMicrotask(() => good({ size })) };
}

function folder(fullPath, children, failing = false) {
  return {
    isDirectory: true,
    fullPath,
    createReader() {
      let at = 0;
      return {
        readEntries(good, bad) {
          const batch = children.slice(at, at + 100);
          at += batch.length;
          queueMicrotask(() => (failing ? bad(new Error('unreadable')) : good(batch)));
        },
      };
    },
  };
}

const many = (path, number) => Array.from(
  { length: number }, (_, at) => file(`${path}/file ${at}`));

test('a folder of 10,000 files gives them all, a hundred at a time', async () => {
  let counted = null;
  const found = await walk([folder('/big', many('/big', 10000))], (sum) => { counted = sum; });
  assert.deepEqual(counted, { files: 10000, folders: 1, bytes: 10000 });
  assert.equal(found.length, 10001);
  assert.equal(new Set(found.map(({ path }) => path)).size, 10001);
});

test('the count shows while it goes on', async () => {
  const seen = [];
  await walk([folder('/a', many('/a', 250))], ({ files }) => seen.push(files));
  assert.deepEqual(seen, [0, 100, 200, 250]);
});

test('folders come before what is in them, and empty ones are kept', async () => {
  const tree = folder('/a', [folder('/a/b', [folder('/a/b/empty', []), file('/a/b/x')]), file('/a/y')]);
  const paths = (await walk([tree, file('/z')])).map(({ path }) => path);
  assert.equal(paths.length, 6);
  for (const path of paths) {
    const parent = path.slice(0, path.lastIndexOf('/'));
    assert.ok(parent === '' || paths.indexOf(parent) < paths.indexOf(path), path);
  }
});

test('folders can be told from files of no bytes', async () => {
  const found = await walk([folder('/a', [file('/a/nothing', 0)])]);
  assert.deepEqual(found.map((one) => Boolean(one.file)), [false, true]);
});

test('a walk that is stopped ends with that', async () => {
  const stop = new AbortController();
  const walking = walk([folder('/a', many('/a', 5000))],
    ({ files }) => files === 100 && stop.abort(), stop.signal);
  await assert.rejects(walking, { name: 'AbortError' });
});

test('a folder that cannot be read is a failure, not an empty folder', async () => {
  await assert.rejects(walk([folder('/a', [], true)]), /unreadable/);
});

test('files of an input come with their folders', () => {
  const found = fromInput([
    { name: 'x', size: 4, webkitRelativePath: 'a/b/x' }, { name: 'y', size: 2 ** 33, webkitRelativePath: '' }]);
  assert.deepEqual(found.map(({ path, size }) => [path, size]), [['/a/b/x', 4], ['/y', 2 ** 33]]);
  assert.deepEqual(topNames(found), ['a', 'y']);
});
