/** A list of any length, of which only the rows in view are in the document. */
import { rowsInView, scrollTo } from './window.mjs';
import { oncePerFrame } from './dom.mjs';

export class VirtualList {
  #scroller;
  #body;
  #render;
  #count = 0;
  #kept = -1;
  #above;

  /**
   * render(index) gives a row's element, the same one each time for the same thing, so that focus
   * stays where it is. `above` is what sticks at the top of the scroller.
   */
  constructor(scroller, body, render, above = null) {
    this.#scroller = scroller;
    this.#body = body;
    this.#render = render;
    this.#above = above;
    this.drawSoon = oncePerFrame(() => this.draw());
    scroller.addEventListener('scroll', this.drawSoon, { passive: true });
    new ResizeObserver(this.drawSoon).observe(scroller);
  }

  get rowHeight() { return parseFloat(getComputedStyle(this.#body).getPropertyValue('--row')); }
  get #height() { return this.#scroller.clientHeight - (this.#above?.offsetHeight ?? 0); }
  get rowsPerView() { return Math.max(1, Math.floor(this.#height / this.rowHeight) - 1); }

  setCount(count) {
    this.#count = count;
    this.draw();
  }

  /** Brings a row into view, and keeps it in the document when it is scrolled away. */
  show(index) {
    this.#kept = index;
    if (index >= 0) {
      this.#scroller.scrollTop =
        scrollTo(index, this.#scroller.scrollTop, this.#height, this.rowHeight);
    }
    this.draw();
  }

  toTop() { this.#scroller.scrollTop = 0; }

  draw() {
    const height = this.rowHeight;
    this.#body.style.height = `${this.#count * height}px`;
    const [first, end] =
      rowsInView(this.#scroller.scrollTop, this.#height, height, this.#count);
    const wanted = [];
    for (let index = first; index < end; index += 1) {
      wanted.push(index);
    }
    if (this.#kept >= end && this.#kept < this.#count) {
      wanted.push(this.#kept);
    } else if (this.#kept >= 0 && this.#kept < first) {
      wanted.unshift(this.#kept);
    }
    this.#place(wanted.map((index) => {
      const row = this.#render(index);
      row.style.transform = `translateY(${index * height}px)`;
      return row;
    }));
  }

  /** Touches only what differs: a row that is taken out and put in again loses the focus. */
  #place(rows) {
    const wanted = new Set(rows);
    for (const row of [...this.#body.children]) {
      if (!wanted.has(row)) {
        row.remove();
      }
    }
    let at = this.#body.firstElementChild;
    for (const row of rows) {
      if (row === at) {
        at = at.nextElementSibling;
      } else {
        this.#body.insertBefore(row, at);
      }
    }
  }
}
