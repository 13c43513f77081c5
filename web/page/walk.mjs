/**
 * Everything in dropped folders, counted before anything is sent: {path, file} for files, {path}
 * for folders, in an order in which folders come before what is in them. Paths begin with a slash.
 */

function promised(entry, method) {
  return new Promise((resolve, reject) => { entry[method](resolve, reject); });
}

/** A browser hands out a hundred or so at a time, and none when there are no more. */
async function* childrenOf(folder) {
  const reader = folder.createReader();
  for (;;) {
    const batch = await promised(reader, 'readEntries');
    if (batch.length === 0) {
      return;
    }
    yield batch;
  }
}

/** counted({files, folders, bytes}) is called as they are found. An aborted signal ends the walk. */
export async function walk(entries, counted = () => {}, signal = undefined) {
  const found = [];
  const sum = { files: 0, folders: 0, bytes: 0 };
  const waiting = [[...entries]];
  while (waiting.length > 0) {
    const batch = waiting.shift();
    signal?.throwIfAborted();
    const files = await Promise.all(
      batch.map((entry) => (entry.isDirectory ? null : promised(entry, 'file'))));
    for (const [at, entry] of batch.entries()) {
      const file = files[at];
      if (file) {
        sum.files += 1;
        sum.bytes += file.size;
        found.push({ path: entry.fullPath, file, size: file.size });
      } else {
        sum.folders += 1;
        found.push({ path: entry.fullPath, size: 0 });
        for await (const children of childrenOf(entry)) {
          waiting.push(children);
        }
      }
    }
    counted(sum);
  }
  return found;
}

/** The same of what a file input gives, for a chosen folder or for single files. */
export function fromInput(files) {
  return [...files].map((file) => (
    { path: `/${file.webkitRelativePath || file.name}`, file, size: file.size }));
}

/** The names in the folder that is open which these would take. */
export function topNames(found) {
  return [...new Set(found.map(({ path }) => path.split('/')[1]))];
}
