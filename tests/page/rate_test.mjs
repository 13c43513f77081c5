import assert from 'node:assert/strict';
import test from 'node:test';
import { Rate } from '../../web/page/rate.mjs';

test('there is no rate before there is something to go by', () => {
  const rate = new Rate();
  assert.equal(rate.perSecond(0), 0);
  rate.add(0, 0);
  rate.add(100, 5000);
  assert.equal(rate.perSecond(100), 0);
  assert.ok(Number.isNaN(rate.secondsLeft(100, 10000)));
});

test('the rate is that of the last seconds, not of the whole', () => {
  const rate = new Rate();
  for (let second = 0; second <= 60; second += 1) {
    rate.add(second * 1000, second <= 30 ? second * 100 : 3000 + (second - 30) * 1000);
  }
  assert.equal(Math.round(rate.perSecond(60000)), 1000);
  assert.equal(Math.round(rate.secondsLeft(60000, 43000)), 10);
});

test('a transfer that stalls gets slower by and by', () => {
  const rate = new Rate();
  rate.add(0, 0);
  rate.add(1000, 1000);
  assert.equal(rate.perSecond(1000), 1000);
  assert.equal(rate.perSecond(4000), 250);
});

test('a transfer that begins anew is measured anew', () => {
  const rate = new Rate();
  rate.add(0, 0);
  rate.add(1000, 100000);
  rate.add(2000, 0);
  rate.add(4000, 2000);
  assert.equal(rate.perSecond(4000), 1000);
});
