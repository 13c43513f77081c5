/** Which rows of an ordered list are chosen, and from where a range is drawn. */

export class Selection {
  #names = new Set();
  #anchor = 0;
  #order = [];

  /** A new order of the same or other names; those that are gone are not chosen any more. */
  setOrder(names) {
    const anchor = this.#order[this.#anchor];
    const there = new Set(names);
    this.#names = new Set([...this.#names].filter((name) => there.has(name)));
    this.#order = names;
    this.#anchor = Math.max(0, names.indexOf(anchor));
  }

  has(name) { return this.#names.has(name); }
  get size() { return this.#names.size; }
  get names() { return this.#order.filter((name) => this.#names.has(name)); }
  get isAll() { return this.size > 0 && this.size === this.#order.length; }

  clear() { this.#names.clear(); }
  all() { this.#names = new Set(this.#order); }
  only(index) {
    this.#names = new Set([this.#order[index]]);
    this.#anchor = index;
  }
  toggle(index) {
    const name = this.#order[index];
    if (!this.#names.delete(name)) {
      this.#names.add(name);
    }
    this.#anchor = index;
  }
  /** From where the last single choice was made to here. */
  extend(index) {
    const [from, to] = [this.#anchor, index].sort((a, b) => a - b);
    this.#names = new Set(this.#order.slice(from, to + 1));
  }
}
