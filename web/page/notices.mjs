/** Failures stay on the page until they are dismissed. */
import { sentences } from './api.mjs';
import { byId, element } from './dom.mjs';

const most = 6;

/** `again` is offered as a button when there is a way to try once more. */
export function showFailure(title, error, again = null) {
  const notice = element('div', { className: 'notice', role: 'alert' },
    element('p', {}, element('strong', { textContent: `${title}:` }), ' ', sentences(error)),
    again && element('button', {
      textContent: 'Try again',
      onclick: () => {
        notice.remove();
        again();
      },
    }),
    element('button', { textContent: 'Dismiss', onclick: () => notice.remove() }));
  const notices = byId('notices');
  while (notices.children.length >= most) {
    notices.firstElementChild.remove();
  }
  notices.append(notice);
}

/** Runs what a person asked for, and shows why it failed. Gives its result, or undefined. */
export async function attempt(title, action) {
  try {
    return await action();
  } catch (error) {
    if (error.name !== 'AbortError') {
      showFailure(title, error);
    }
    return undefined;
  }
}
