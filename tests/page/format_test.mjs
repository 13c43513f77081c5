import assert from 'node:assert/strict';
import test from 'node:test';
import * as format from '../../web/page/format.mjs';

test('sizes have the unit that fits', () => {
  for (const [bytes, text] of [
    [0, '0 bytes'], [1, '1 byte'], [999, '999 bytes'], [1000, '1.0 KB'], [9949, '9.9 KB'],
    [9950, '10 KB'], [999499, '999 KB'], [999500, '1.0 MB'], [5 * 2 ** 30, '5.4 GB'],
    [2 ** 53, '9.0 PB'], [1e19, '10000 PB']]) {
    assert.equal(format.size(bytes), text);
  }
});

test('a size that is not known is not shown', () => {
  for (const bytes of [undefined, null, -1, NaN, Infinity]) {
    assert.equal(format.size(bytes), '');
  }
});

test('time left is no finer than needed', () => {
  for (const [seconds, text] of [
    [0, '1 s left'], [1.2, '2 s left'], [59, '59 s left'], [90, '2 min left'],
    [3600, '1 h 0 min left'], [5400, '1 h 30 min left']]) {
    assert.equal(format.timeLeft(seconds), text);
  }
});

test('time left that nobody can tell is not shown', () => {
  for (const seconds of [NaN, Infinity, -1, undefined]) {
    assert.equal(format.timeLeft(seconds), '');
  }
});

test('a rate of nothing is not shown', () => {
  assert.equal(format.rate(0), '');
  assert.equal(format.rate(1.5e6), '1.5 MB/s');
});

test('one is one and others are many', () => {
  assert.equal(format.count(1, 'file'), '1 file');
  assert.equal(format.count(10000, 'file'), '10,000 files');
  assert.equal(format.count(0, 'entry', 'entries'), '0 entries');
});

test('a part of nothing is nothing, and never more than all', () => {
  assert.equal(format.percent(0, 0), 0);
  assert.equal(format.percent(1, 3), 33);
  assert.equal(format.percent(5, 4), 100);
  assert.equal(format.percent(2 ** 40 - 1, 2 ** 40), 99);
});

test('a time that is not known is not shown', () => {
  assert.equal(format.date(0), '');
  assert.equal(format.date(undefined), '');
  assert.match(format.date(1700000000), /2023/);
});
