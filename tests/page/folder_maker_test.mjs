import assert from 'node:assert/strict';
import test from 'node:test';
import { FolderMaker } from '../../web/page/folder_maker.mjs';

function maker(answer = () => {}) {
  const asked = [];
  const folders = new FolderMaker(async (connection, path) => {
    asked.push(path);
    await null;
    return answer(path);
  });
  return { folders, asked };
}

const failure = (status) => Object.assign(new Error(String(status)), { status });

test('what is open is there, and is not asked for', async () => {
  const { folders, asked } = maker();
  await folders.make('c', '/a/b', '/a/b');
  await folders.make('c', '/', '/a/b');
  assert.deepEqual(asked, []);
});

test('parents come first, and each is asked for once', async () => {
  const { folders, asked } = maker();
  await Promise.all([
    folders.make('c', '/a/b/c', '/a'), folders.make('c', '/a/b/d', '/a'),
    folders.make('c', '/a/b/c', '/a')]);
  assert.deepEqual(asked, ['/a/b', '/a/b/c', '/a/b/d']);
});

test('a folder that is there already is as good as a new one', async () => {
  const { folders } = maker(() => { throw failure(409); });
  await folders.make('c', '/x', '/');
});

test('a failure is told to all who wait, and the next one asks again', async () => {
  let broken = true;
  const { folders, asked } = maker(() => { if (broken) throw failure(507); });
  const both = await Promise.allSettled([
    folders.make('c', '/x/a', '/'), folders.make('c', '/x/b', '/')]);
  assert.deepEqual(both.map(({ reason }) => reason.status), [507, 507]);
  assert.deepEqual(asked, ['/x']);
  broken = false;
  await folders.make('c', '/x/a', '/');
  assert.deepEqual(asked, ['/x', '/x', '/x/a']);
});

test('the same path of another connection is another folder', async () => {
  const { folders, asked } = maker();
  await folders.make('one', '/x', '/');
  await folders.make('two', '/x', '/');
  assert.deepEqual(asked, ['/x', '/x']);
});
