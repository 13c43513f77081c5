/** Folders for what is uploaded: each is asked for once, its parent first. */
import { isWithin, parentOf } from './paths.mjs';

const exists = 409;

export class FolderMaker {
  #mkdir;
  #made = new Map();

  /** mkdir(connection, path) fails with a status. */
  constructor(mkdir) {
    this.#mkdir = mkdir;
  }

  forget() { this.#made.clear(); }

  /** `there` is known to be there, with all above it. A failed one is asked for again. */
  make(connection, path, there) {
    if (isWithin(there, path)) {
      return Promise.resolve();
    }
    const key = `${connection}\n${path}`;
    if (!this.#made.has(key)) {
      const made = this.make(connection, parentOf(path), there)
        .then(() => this.#mkdir(connection, path))
        .catch((error) => {
          if (error.status !== exists) {
            this.#made.delete(key);
            throw error;
          }
        });
      this.#made.set(key, made);
    }
    return this.#made.get(key);
  }
}
