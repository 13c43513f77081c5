import assert from 'node:assert/strict';
import test from 'node:test';
import { Queue } from '../../web/page/queue.mjs';

/** A queue whose transfers end when the test says so. */
function setUp(parallel = 2) {
  const flying = new Map();
  const clock = { now: 0 };
  const queue = new Queue((item, report) => {
    const transfer = { item, report };
    transfer.done = new Promise((resolve, reject) => { Object.assign(transfer, { resolve, reject }); });
    transfer.cancel = () => transfer.reject(new DOMException('Stopped', 'AbortError'));
    flying.set(item.path, transfer);
    return transfer;
  }, () => {}, { parallel, now: () => clock.now });
  const settle = () => new Promise((resolve) => { setImmediate(resolve); });
  const end = async (path, error) => {
    const transfer = flying.get(path);
    flying.delete(path);
    if (error) transfer.reject(error); else transfer.resolve();
    await settle();
  };
  return { queue, flying, clock, end, settle };
}

const item = (path, size = 100) => ({ path, size });
const states = (queue) => Object.fromEntries(queue.items.map(({ path, state }) => [path, state]));

test('some run at once and the others wait for their turn', async () => {
  const { queue, flying, end } = setUp(2);
  queue.add([item('a'), item('b'), item('c')]);
  assert.deepEqual([...flying.keys()], ['a', 'b']);
  assert.deepEqual(states(queue), { a: 'running', b: 'running', c: 'waiting' });
  await end('a');
  assert.deepEqual(states(queue), { a: 'done', b: 'running', c: 'running' });
});

test('a failure stays, says why, and does not hold the others', async () => {
  const { queue, end } = setUp(1);
  queue.add([item('a'), item('b')]);
  await end('a', new Error('quota'));
  assert.deepEqual(states(queue), { a: 'failed', b: 'running' });
  await end('b');
  assert.equal(queue.items[0].error.message, 'quota');
  assert.equal(queue.totals.failed, 1);
  assert.ok(!queue.isBusy);
});

test('that one file is tried again, from its beginning', async () => {
  const { queue, flying, end } = setUp(1);
  const [one] = [item('a')];
  queue.add([one]);
  flying.get('a').report(60);
  await end('a', new Error('gone'));
  assert.equal(one.sent, 0);
  queue.retry(one);
  assert.equal(one.state, 'running');
  assert.equal(one.error, undefined);
  await end('a');
  assert.deepEqual(states(queue), { a: 'done' });
  assert.equal(queue.totals.sent, 100);
});

test('all failures are tried again at once', async () => {
  const { queue, end } = setUp(2);
  queue.add([item('a'), item('b')]);
  await end('a', new Error('x'));
  await end('b', new Error('x'));
  queue.retryAll();
  assert.deepEqual(states(queue), { a: 'running', b: 'running' });
});

test('a failure goes when it is dismissed, and its bytes with it', async () => {
  const { queue, end } = setUp(1);
  const one = item('a');
  queue.add([one]);
  await end('a', new Error('x'));
  queue.dismiss(one);
  assert.deepEqual(queue.items, []);
  assert.equal(queue.totals.total, 0);
});

test('a running and a waiting upload are cancelled', async () => {
  const { queue, settle } = setUp(1);
  const [a, b, c] = [item('a'), item('b'), item('c')];
  queue.add([a, b, c]);
  queue.cancel(b);
  queue.cancel(a);
  await settle();
  assert.deepEqual([a.state, b.state, c.state], ['cancelled', 'cancelled', 'running']);
  assert.equal(queue.totals.total, 100);
});

test('all are cancelled at once and none begins after that', async () => {
  const { queue, flying, settle } = setUp(2);
  queue.add(['a', 'b', 'c', 'd'].map((path) => item(path)));
  queue.cancelAll();
  await settle();
  assert.deepEqual(queue.items, []);
  assert.deepEqual([...flying.keys()], ['a', 'b']);
  assert.equal(queue.totals.sent, 0);
});

test('the sums count what has gone, with what a form adds left out', async () => {
  const { queue, flying, end } = setUp(2);
  queue.add([item('a', 1000), item('b', 3000)]);
  flying.get('a').report(1200);
  flying.get('b').report(500);
  assert.equal(queue.totals.sent, 1500);
  assert.equal(queue.totals.total, 4000);
  await end('a');
  assert.equal(queue.totals.sent, 1500);
  assert.equal(queue.totals.done, 1);
});

test('rate and time left come from the bytes of all', () => {
  const { queue, flying, clock } = setUp(2);
  queue.add([item('a', 1000), item('b', 1000)]);
  clock.now = 1000;
  flying.get('a').report(300);
  flying.get('b').report(200);
  assert.equal(queue.totals.rate, 500);
  assert.equal(queue.totals.left, 3);
});

test('bytes that a stopped transfer still tells of are not counted', async () => {
  const { queue, flying, settle } = setUp(1);
  const one = item('a');
  queue.add([one]);
  const { report } = flying.get('a');
  report(40);
  queue.cancel(one);
  await settle();
  report(80);
  assert.equal(queue.totals.sent, 0);
});

test('failures come first, then what runs, what waits and what is done', async () => {
  const { queue, end } = setUp(1);
  queue.add(['a', 'b', 'c', 'd'].map((path) => item(path)));
  await end('a');
  await end('b', new Error('x'));
  assert.deepEqual(queue.items.map(({ path }) => path), ['b', 'c', 'd', 'a']);
});

test('what is done is cleared, and the sums begin anew', async () => {
  const { queue, end } = setUp(1);
  queue.add([item('a')]);
  await end('a');
  queue.clearDone();
  assert.deepEqual(queue.items, []);
  assert.deepEqual([queue.totals.total, queue.totals.sent], [0, 0]);
});

test('one that is done is dismissed, and the others still add up', async () => {
  const { queue, end } = setUp(2);
  const one = item('a', 700);
  queue.add([one, item('b', 300)]);
  await end('a');
  queue.dismiss(one);
  assert.deepEqual([queue.totals.total, queue.totals.sent], [300, 0]);
});

test('10,000 files queue up at once', async () => {
  const { queue, end } = setUp(2);
  queue.add(Array.from({ length: 10000 }, (_, at) => item(`f${at}`)));
  await end('f0');
  assert.equal(queue.totals.files, 10000);
  assert.equal(queue.items.filter(({ state }) => state === 'running').length, 2);
});
