/** Paths below a connection: they begin with a slash, and end with none but the root's. */

export function join(folder, name) {
  return folder === '/' ? `/${name}` : `${folder}/${name}`;
}

export function parentOf(path) {
  return path.slice(0, path.lastIndexOf('/')) || '/';
}

export function nameOf(path) {
  return path.slice(path.lastIndexOf('/') + 1);
}

/** The folders on the way to a path, the root first, each with its own path. */
export function crumbs(path) {
  const names = path.split('/').filter(Boolean);
  return names.reduce(
    (found, name) => [...found, { name, path: join(found.at(-1).path, name) }],
    [{ name: '', path: '/' }]);
}

/** Whether `path` is `folder` or somewhere below it. */
export function isWithin(path, folder) {
  return path === folder || path.startsWith(folder === '/' ? '/' : `${folder}/`);
}

const longestName = 255;

/** What is wrong with a name, for the person who typed it; empty for a good one. */
export function whatIsWrong(name) {
  if (name === '' || name === '.' || name === '..') {
    return 'Type a name.';
  }
  if (/[/\0]|\p{Surrogate}/u.test(name)) {
    return name.includes('/') ? 'A name cannot have a slash.'
      : 'The name has a character that names cannot have.';
  }
  return new TextEncoder().encode(name).length > longestName
    ? 'The name is too long. Shorten it.' : '';
}

/** The address fragment that leads to a folder, and back. */
export function toFragment(connection, path) {
  return `#${new URLSearchParams({ c: connection, p: path })}`;
}

export function fromFragment(fragment) {
  const parameters = new URLSearchParams(fragment.slice(1));
  const path = parameters.get('p') ?? '/';
  return { connection: parameters.get('c'), path: path.startsWith('/') ? path : '/' };
}
