import assert from 'node:assert/strict';
import test from 'node:test';
import { Selection } from '../../web/page/selection.mjs';

function of(...names) {
  const selection = new Selection();
  selection.setOrder(names);
  return selection;
}

test('a range goes from the last single choice, in either direction', () => {
  const selection = of('a', 'b', 'c', 'd');
  selection.only(2);
  selection.extend(3);
  assert.deepEqual(selection.names, ['c', 'd']);
  selection.extend(0);
  assert.deepEqual(selection.names, ['a', 'b', 'c']);
});

test('a toggled one goes in and out, and is where a range begins', () => {
  const selection = of('a', 'b', 'c');
  selection.toggle(1);
  assert.deepEqual(selection.names, ['b']);
  selection.toggle(1);
  assert.equal(selection.size, 0);
  selection.extend(2);
  assert.deepEqual(selection.names, ['b', 'c']);
});

test('another order keeps what is chosen and forgets what is gone', () => {
  const selection = of('a', 'b', 'c');
  selection.only(0);
  selection.toggle(2);
  selection.setOrder(['d', 'c', 'b']);
  assert.deepEqual(selection.names, ['c']);
  selection.extend(2);
  assert.deepEqual(selection.names, ['c', 'b']);
});

test('all is all, and an empty folder has no all', () => {
  const selection = of('a', 'b');
  selection.all();
  assert.ok(selection.isAll);
  selection.toggle(0);
  assert.ok(!selection.isAll);
  assert.ok(!of().isAll);
});
