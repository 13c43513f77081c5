/** Which rows of a long list are in view, with some around them for quick scrolling. */

const around = 8;

/** First row and the one behind the last. */
export function rowsInView(scrolled, height, rowHeight, count) {
  const first = Math.floor(scrolled / rowHeight) - around;
  const last = Math.ceil((scrolled + height) / rowHeight) + around;
  return [Math.min(Math.max(0, first), count), Math.max(0, Math.min(count, last))];
}

/** Where to scroll so that a row is in view, as near as may be to where the list stands. */
export function scrollTo(index, scrolled, height, rowHeight) {
  const top = index * rowHeight;
  return Math.max(0, Math.min(Math.max(scrolled, top + rowHeight - height), top));
}
