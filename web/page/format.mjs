/** Numbers as people read them. */

const units = ['bytes', 'KB', 'MB', 'GB', 'TB', 'PB'];

/** A size in steps of 1,000, as drives and services count; empty for one that is not known. */
export function size(bytes) {
  if (!Number.isFinite(bytes) || bytes < 0) {
    return '';
  }
  let step = 0;
  let value = bytes;
  // What would round to 1,000 of a unit is 1 of the next.
  while (step < units.length - 1 && value >= (step === 0 ? 1000 : 999.5)) {
    value /= 1000;
    step += 1;
  }
  const digits = step > 0 && value < 9.95 ? 1 : 0;
  return `${value.toFixed(digits)} ${step === 0 && bytes === 1 ? 'byte' : units[step]}`;
}

export function rate(bytesPerSecond) {
  return bytesPerSecond > 0 ? `${size(bytesPerSecond)}/s` : '';
}

/** How long is left, no finer than anybody needs. */
export function timeLeft(seconds) {
  if (!Number.isFinite(seconds) || seconds < 0) {
    return '';
  }
  if (seconds < 60) {
    return `${Math.max(1, Math.ceil(seconds))} s left`;
  }
  const minutes = Math.round(seconds / 60);
  return minutes < 60 ? `${minutes} min left`
    : `${Math.floor(minutes / 60)} h ${minutes % 60} min left`;
}

export function count(number, one, many = `${one}s`) {
  return `${number.toLocaleString('en')} ${number === 1 ? one : many}`;
}

export function percent(done, total) {
  return total > 0 ? Math.min(100, Math.floor((done / total) * 100)) : 0;
}

const dates = new Intl.DateTimeFormat(undefined, { dateStyle: 'medium', timeStyle: 'short' });

/** A time in seconds; empty for one that is not known. */
export function date(seconds) {
  return seconds > 0 ? dates.format(seconds * 1000) : '';
}
