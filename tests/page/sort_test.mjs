import assert from 'node:assert/strict';
import test from 'node:test';
import { sorted } from '../../web/page/sort.mjs';

const entry = (name, size, modified, folder = false) => ({ name, size, modified, folder });
const names = (entries) => entries.map(({ name }) => name);

test('numbers in names count as numbers', () => {
  const all = ['f10', 'f9', 'F1', 'f100'].map((name) => entry(name, 1, 1));
  assert.deepEqual(names(sorted(all, 'name', false)), ['F1', 'f9', 'f10', 'f100']);
  assert.deepEqual(names(sorted(all, 'name', true)), ['f100', 'f10', 'f9', 'F1']);
});

test('folders stand first in either direction', () => {
  const all = [entry('a', 9, 9), entry('z', 0, 0, true), entry('b', 1, 1)];
  assert.deepEqual(names(sorted(all, 'size', false)), ['z', 'b', 'a']);
  assert.deepEqual(names(sorted(all, 'size', true)), ['z', 'a', 'b']);
  assert.deepEqual(names(sorted(all, 'modified', true)), ['z', 'a', 'b']);
});

test('what is equal goes by name, and unknown comes before known', () => {
  const all = [entry('b', 5), entry('c'), entry('a', 5)];
  assert.deepEqual(names(sorted(all, 'size', false)), ['c', 'a', 'b']);
});

test('names that differ in case alone have one order', () => {
  const all = [entry('a', 1), entry('A', 1)];
  assert.deepEqual(names(sorted(all, 'name', false)), names(sorted([...all].reverse(), 'name', false)));
});

test('the list that was given stays as it was', () => {
  const all = [entry('b', 1), entry('a', 1)];
  sorted(all, 'name', false);
  assert.deepEqual(names(all), ['b', 'a']);
});
