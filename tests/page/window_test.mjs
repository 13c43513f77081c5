import assert from 'node:assert/strict';
import test from 'node:test';
import { rowsInView, scrollTo } from '../../web/page/window.mjs';

test('only rows in view and a few around them are made', () => {
  const [first, end] = rowsInView(200000, 400, 40, 10000);
  assert.ok(first <= 5000 && end >= 5010);
  assert.ok(end - first < 40);
});

test('a list has no rows before its first or behind its last', () => {
  assert.deepEqual(rowsInView(0, 400, 40, 3), [0, 3]);
  assert.deepEqual(rowsInView(0, 400, 40, 0), [0, 0]);
  assert.equal(rowsInView(400000, 400, 40, 10000)[1], 10000);
});

test('a list that became shorter than where it stands has no rows of a negative number', () => {
  const [first, end] = rowsInView(100000, 400, 40, 2);
  assert.ok(first >= 0 && end >= 0 && first <= 2 && end <= 2);
});

test('a row in view is not scrolled, others come in by the nearest edge', () => {
  assert.equal(scrollTo(5, 0, 400, 40), 0);
  assert.equal(scrollTo(10, 0, 400, 40), 40);
  assert.equal(scrollTo(2, 400, 400, 40), 80);
  assert.equal(scrollTo(0, 400, 400, 40), 0);
});
