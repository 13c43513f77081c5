/** The order of entries. */

const collator = new Intl.Collator(undefined, { numeric: true, sensitivity: 'base' });

const orders = {
  name: () => 0,
  size: (a, b) => (a.size ?? -1) - (b.size ?? -1),
  modified: (a, b) => (a.modified ?? 0) - (b.modified ?? 0),
};

/** Folders stand first whatever the order; what is equal goes by name. */
export function sorted(entries, key, descending) {
  const order = orders[key];
  const sign = descending ? -1 : 1;
  return entries.toSorted
    ? entries.toSorted(compare) : [...entries].sort(compare);

  function compare(a, b) {
    if (a.folder !== b.folder) {
      return a.folder ? -1 : 1;
    }
    const byName = collator.compare(a.name, b.name) || (a.name < b.name ? -1 : 1);
    return sign * (order(a, b) || byName);
  }
}
