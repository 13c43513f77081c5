import assert from 'node:assert/strict';
import test from 'node:test';
import * as paths from '../../web/page/paths.mjs';

test('a name joins the root and a folder', () => {
  assert.equal(paths.join('/', 'a'), '/a');
  assert.equal(paths.join('/a/b', 'c d'), '/a/b/c d');
});

test('the folder above, and the last name', () => {
  for (const [path, parent, name] of [
    ['/a/b', '/a', 'b'], ['/a', '/', 'a'], ['/', '/', ''], ['/ü/..x', '/ü', '..x']]) {
    assert.equal(paths.parentOf(path), parent);
    assert.equal(paths.nameOf(path), name);
  }
});

test('the way to a path begins at the root', () => {
  assert.deepEqual(paths.crumbs('/'), [{ name: '', path: '/' }]);
  assert.deepEqual(paths.crumbs('/a/b'), [
    { name: '', path: '/' }, { name: 'a', path: '/a' }, { name: 'b', path: '/a/b' }]);
});

test('a folder whose name only begins the same is another one', () => {
  assert.ok(paths.isWithin('/a', '/a'));
  assert.ok(paths.isWithin('/a/b', '/a'));
  assert.ok(paths.isWithin('/a', '/'));
  assert.ok(!paths.isWithin('/ab', '/a'));
  assert.ok(!paths.isWithin('/', '/a'));
});

test('names that no folder can hold are told of, in words', () => {
  for (const name of ['', '.', '..', 'a/b', 'a\0', '\ud800', 'x'.repeat(256), 'ü'.repeat(128)]) {
    assert.match(paths.whatIsWrong(name), /\.$/, JSON.stringify(name));
  }
  for (const name of ['a', '...', ' ', 'a\nb', '<img src=x>', '😀', 'x'.repeat(255), '"\'`\\']) {
    assert.equal(paths.whatIsWrong(name), '', name);
  }
});

test('the address leads back to the same folder, whatever its name', () => {
  for (const path of ['/', '/a&b=c/#d', '/100 %/ü+😀', '/"\'<>']) {
    const fragment = paths.toFragment('dav://remo@host:8080', path);
    assert.deepEqual(paths.fromFragment(fragment), { connection: 'dav://remo@host:8080', path });
  }
});

test('an address without a folder leads to none, and a broken path to the root', () => {
  assert.deepEqual(paths.fromFragment(''), { connection: null, path: '/' });
  assert.equal(paths.fromFragment('#c=x&p=../../etc').path, '/');
});
