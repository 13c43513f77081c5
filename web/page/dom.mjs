/** Elements are made here, and text goes into them as text: no name, alias or error is ever markup. */

export function element(tag, properties = {}, ...children) {
  const made = document.createElement(tag);
  for (const [key, value] of Object.entries(properties)) {
    if (key.startsWith('on')) {
      made.addEventListener(key.slice(2), value);
    } else if (key in made) {
      made[key] = value;
    } else if (value !== undefined && value !== null && value !== false) {
      made.setAttribute(key, value === true ? '' : value);
    }
  }
  made.append(...children.filter((child) => child !== null && child !== undefined));
  return made;
}

export function byId(id) {
  return document.getElementById(id);
}

const shapes = {
  folder: 'M3 6a2 2 0 0 1 2-2h4l2 2h8a2 2 0 0 1 2 2v9a2 2 0 0 1-2 2H5a2 2 0 0 1-2-2z',
  file: 'M6 3h8l5 5v12a1 1 0 0 1-1 1H6a1 1 0 0 1-1-1V4a1 1 0 0 1 1-1z M14 3v5h5',
  document: 'M6 3h8l5 5v12a1 1 0 0 1-1 1H6a1 1 0 0 1-1-1V4a1 1 0 0 1 1-1z M8 12h8 M8 16h8',
  cloud: 'M7 19a5 5 0 0 1-.6-9.96 6 6 0 0 1 11.6 1.5A4.2 4.2 0 0 1 17.5 19z',
  server: 'M4 4h16v7H4z M4 13h16v7H4z M7 7.5h.01 M7 16.5h.01',
};

const svg = 'http://www.w3.org/2000/svg';

/** A picture that says nothing that the text beside it does not. */
export function icon(name) {
  const picture = document.createElementNS(svg, 'svg');
  picture.setAttribute('viewBox', '0 0 24 24');
  picture.setAttribute('class', `icon icon-${name}`);
  picture.setAttribute('aria-hidden', 'true');
  const path = document.createElementNS(svg, 'path');
  path.setAttribute('d', shapes[name]);
  picture.append(path);
  return picture;
}

/** For those who do not see what has changed. */
export function announce(text) {
  byId('status').textContent = text;
}

/** Runs at most once before the next picture, however often it is asked for. */
export function oncePerFrame(run) {
  let asked = false;
  return () => {
    if (!asked) {
      asked = true;
      requestAnimationFrame(() => {
        asked = false;
        run();
      });
    }
  };
}
