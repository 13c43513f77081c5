/** Requests to the program behind the page. */

/** Without the name and password that the page's own address may carry. */
const base = new URL('api/', location.origin + location.pathname);

const own = { 'X-Zyrovfs-Request': '1' };

const words = {
  0: ['The box cannot be reached.', 'Check your network, then try again.'],
  401: ['You are not logged in any more.', 'Load the page again and log in.'],
  403: ['The box does not allow this.', 'Ask its administrator.'],
  404: ['This is not there any more.', 'Load the folder again.'],
  413: ['The box does not take requests of this size.', 'Ask its administrator.'],
};

export class ApiError extends Error {
  constructor(status, error = {}) {
    const [meaning, advice] = words[status] ??
      ['The box did not answer as it should.', 'Try again in a moment.'];
    super(error.meaning ?? meaning);
    this.name = 'ApiError';
    this.status = status;
    this.advice = error.meaning ? error.advice : advice;
    this.cause = error.name;
    this.trust = error.trust;
  }
}

/** What to tell a person of any failure. */
export function sentences(error) {
  const meaning = /[.!?]$/.test(error.message) ? error.message : `${error.message}.`;
  return error.advice ? `${meaning} ${error.advice}` : meaning;
}

/** A parameter may have several values. */
export function address(action, parameters = {}) {
  const url = new URL(action, base);
  for (const [key, value] of Object.entries(parameters)) {
    for (const one of [value].flat()) {
      url.searchParams.append(key, one);
    }
  }
  return url;
}

/** The answer of a text, or the failure that it tells of. */
export function read(status, text) {
  let answer = null;
  try {
    answer = JSON.parse(text);
  } catch {
    // The web server's own pages are not for this page.
  }
  if (status < 200 || status >= 300 || answer === null) {
    throw new ApiError(status, answer?.error);
  }
  return answer;
}

async function send(url, options) {
  let response;
  let text;
  try {
    response = await fetch(url, { cache: 'no-store', ...options });
    text = await response.text();
  } catch (error) {
    throw error.name === 'AbortError' ? error : new ApiError(0);
  }
  return read(response.status, text);
}

export function get(action, parameters, signal) {
  return send(address(action, parameters), { signal });
}

export function post(action, body) {
  return send(address(action), {
    method: 'POST',
    headers: { ...own, 'Content-Type': 'application/json' },
    body: JSON.stringify(body),
  });
}

/** Fails in words if a file cannot be had, before the browser is sent for it. */
export async function probe(url) {
  const response = await fetch(url, { method: 'HEAD', cache: 'no-store' })
    .catch(() => { throw new ApiError(0); });
  if (!response.ok) {
    // The words are in the answer to the request itself.
    await send(url, {});
  }
}

/** {done, cancel}: one file, told of by report(bytes); see Queue. `id` names it to the box. */
export function upload(parameters, file, report) {
  const request = new XMLHttpRequest();
  const form = new FormData();
  form.append('file', file);
  const done = new Promise((resolve, reject) => {
    request.open('POST', address('upload', parameters));
    request.setRequestHeader('X-Zyrovfs-Request', '1');
    request.upload.onprogress = (event) => report(event.loaded);
    request.onload = () => {
      try {
        resolve(read(request.status, request.responseText));
      } catch (error) {
        reject(error);
      }
    };
    request.onerror = () => reject(new ApiError(0));
    request.onabort = () => reject(new DOMException('Stopped', 'AbortError'));
    request.send(form);
  });
  return { done, cancel: () => request.abort() };
}
