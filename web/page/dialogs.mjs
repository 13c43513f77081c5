/** Questions to the person before the page. */
import { sentences } from './api.mjs';
import { element } from './dom.mjs';

let number = 0;

/**
 * Shows `body` in a dialogue. When it is accepted, `submit` runs; what it gives is the result, and
 * when it fails the dialogue stays and says why. Closed in any other way the result is null.
 * `choices` are further ways to accept: [[text, value]], with the value given to `submit`.
 */
export function ask({ title, body = [], accept = 'OK', danger = false, submit = () => true,
  choices = [], close = 'Cancel' }) {
  number += 1;
  return new Promise((resolve) => {
    let result = null;
    const problem = element('p', { className: 'problem', role: 'alert' });
    const button = (text, value, kind) => element('button', {
      type: 'submit', className: kind, value, textContent: text });
    const buttons = element('div', { className: 'buttons' },
      element('button', { type: 'button', textContent: close, onclick: () => dialog.close() }),
      ...choices.map(([text, value]) => button(text, value, '')),
      accept ? button(accept, 'accept', danger ? 'danger' : 'primary') : null);
    const form = element('form', { noValidate: true, onsubmit: send },
      element('h2', { id: `dialog-${number}`, textContent: title }), ...body, problem, buttons);
    const dialog = element('dialog', {
      'aria-labelledby': `dialog-${number}`,
      onclose: () => {
        dialog.remove();
        resolve(result);
      },
    }, form);
    document.body.append(dialog);
    dialog.showModal();
    form.querySelector('[autofocus], input, select, .choices button')?.focus();

    // For buttons in the body that are an answer by themselves; Enter is not theirs.
    form.accept = accepted;

    function send(event) {
      event.preventDefault();
      const missing = form.querySelector(':invalid:not(fieldset)');
      if (missing) {
        problem.textContent = `${missing.labels?.[0]?.textContent ?? 'This'}: ` +
          (missing.validity.valueMissing ? 'fill this in.' : 'this cannot be used.');
        missing.focus();
        return;
      }
      accepted(event.submitter?.value ?? 'accept');
    }

    async function accepted(value) {
      problem.textContent = '';
      form.setAttribute('aria-busy', 'true');
      buttons.querySelectorAll('[type=submit]').forEach((one) => { one.disabled = true; });
      try {
        result = await submit(value);
        dialog.close();
      } catch (error) {
        problem.textContent = sentences(error);
      } finally {
        form.removeAttribute('aria-busy');
        buttons.querySelectorAll('[type=submit]').forEach((one) => { one.disabled = false; });
      }
    }
  });
}

export function paragraph(text, className = '') {
  return element('p', { textContent: text, className });
}

/** An input with its label; the input is `.control` of what comes back. */
export function field(label, control) {
  number += 1;
  control.id = `field-${number}`;
  const made = element('div', { className: control.type === 'checkbox' ? 'field check' : 'field' },
    element('label', { htmlFor: control.id, textContent: label }), control);
  made.control = control;
  return made;
}

/** Asks for one name; `submit` gets it and does what it is for. */
export function askName({ title, label, value = '', accept, check, submit }) {
  const input = element('input', { type: 'text', value, autocomplete: 'off', spellcheck: false });
  const asked = ask({
    title,
    accept,
    body: [field(label, input)],
    submit: () => {
      const wrong = check(input.value);
      if (wrong) {
        input.focus();
        throw new Error(wrong);
      }
      return submit(input.value);
    },
  });
  // The name without its ending is what most people want to change.
  const dot = value.lastIndexOf('.');
  input.setSelectionRange(0, dot > 0 ? dot : value.length);
  return asked;
}
