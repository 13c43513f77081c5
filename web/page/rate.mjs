/** How fast bytes have gone lately. Times are in milliseconds. */

const memory = 8000;

export class Rate {
  #samples = [];

  /** `bytes` is the sum so far. */
  add(now, bytes) {
    const last = this.#samples.at(-1);
    if (last && bytes < last.bytes) {
      this.#samples = [];
    }
    this.#samples.push({ now, bytes });
    while (this.#samples.length > 2 && now - this.#samples[1].now >= memory) {
      this.#samples.shift();
    }
  }

  perSecond(now) {
    const first = this.#samples[0];
    const last = this.#samples.at(-1);
    const seconds = first ? (now - first.now) / 1000 : 0;
    return seconds >= 0.5 ? (last.bytes - first.bytes) / seconds : 0;
  }

  secondsLeft(now, total) {
    const speed = this.perSecond(now);
    return speed > 0 ? (total - this.#samples.at(-1).bytes) / speed : NaN;
  }
}
