/** Downloads are the browser's own: it asks where to, shows how far, and can go on later. */
import { address, probe } from './api.mjs';
import { ask, paragraph, field } from './dialogs.mjs';
import { announce, element } from './dom.mjs';
import { join } from './paths.mjs';

/** What fits into the line of a request that web servers take. */
const longest = 7500;

async function start(url) {
  if (url.href.length > longest) {
    throw new Error('Too many items are chosen for one download. Choose fewer, or their folder.');
  }
  announce('Looking for what is to be downloaded');
  await probe(url);
  const link = element('a', { href: url.href, download: '' });
  document.body.append(link);
  link.click();
  link.remove();
}

/** What a document that has no bytes of its own is to become; null when that is not said. */
function askFormat(entry) {
  const choice = element('select', {}, ...entry.exports.map(
    ({ format, title, extension }) => element('option', {
      value: format, textContent: extension ? `${title} (.${extension})` : title })));
  return ask({
    title: `Download “${entry.name}”`,
    body: [paragraph('This document is kept by the service. Choose what to make of it.'),
      field('Format', choice)],
    accept: 'Download',
    submit: () => choice.value,
  });
}

/** Of the folder `path` the entries, or the folder itself for null. */
export async function download(connection, path, entries) {
  if (entries?.length === 1 && !entries[0].folder) {
    const [entry] = entries;
    const format = entry.exports?.length ? await askFormat(entry) : undefined;
    if (format !== null) {
      const url = address('download', {
        connection, path: join(path, entry.name), ...(format && { export: format }) });
      await start(url);
    }
    return;
  }
  await start(address('zip', {
    connection, path: entries ? entries.map((entry) => join(path, entry.name)) : path }));
}
