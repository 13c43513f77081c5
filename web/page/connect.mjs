/** Making a connection, with the questions that a remote side may raise on the way. */
import { get, post } from './api.mjs';
import { ask, field, paragraph } from './dialogs.mjs';
import { element } from './dom.mjs';
import { date } from './format.mjs';

const refused = new Set(['VFS_ERR_WRONG_PASSWORD', 'VFS_ERR_UNAUTHORIZED', 'VFS_ERR_WRONG_USERNAME']);

/** Posts until there is a connection. Null when the person does not want to go on. */
export async function connectWith(action, body, { askPassword = false } = {}) {
  let wanted = body;
  for (;;) {
    try {
      return await post(action, wanted);
    } catch (error) {
      if (error.trust) {
        if (!await askTrust(error.trust)) {
          return null;
        }
        wanted = { ...wanted, accept: error.trust.token };
      } else if (askPassword && refused.has(error.cause)) {
        const password = await askForPassword(error);
        if (password === null) {
          return null;
        }
        wanted = { ...wanted, password };
      } else {
        throw error;
      }
    }
  }
}

function askForPassword(error) {
  const input = element('input', {
    type: 'password', required: true, autocomplete: 'current-password' });
  return ask({
    title: 'Password',
    body: [paragraph(error.message), field('Password', input)],
    accept: 'Connect',
    submit: () => input.value,
  });
}

const facts = [['host', 'Host'], ['type', 'Kind of key'], ['fingerprint', 'Fingerprint'],
  ['subject', 'Issued to'], ['issuer', 'Issued by'], ['valid_from', 'Valid from'],
  ['valid_to', 'Valid to']];
const times = new Set(['valid_from', 'valid_to']);

function askTrust(trust) {
  const key = trust.kind === 'host_key';
  const what = key ? 'host key' : 'certificate';
  const table = element('dl', {}, ...facts.filter(([name]) => trust[name])
    .flatMap(([name, label]) => [element('dt', { textContent: label }),
      element('dd', { textContent: times.has(name) ? date(trust[name]) : trust[name] })]));
  const problems = trust.problems?.length
    ? [element('ul', {}, ...trust.problems.map((text) => element('li', { textContent: text })))] : [];
  return ask({
    title: trust.changed ? `The ${what} has CHANGED` : key ? 'Unknown host key'
      : 'The certificate is not trusted',
    body: [
      paragraph(trust.changed
        ? `This server does not show the ${what} that it showed before. Somebody may be listening ` +
          'in. Go on only if its owner has told you of the change.'
        : `Compare this with what the server's owner tells you. If it is the same, the ${what} is ` +
          'remembered and not asked about again.', trust.changed ? 'warning' : ''),
      table, ...problems],
    accept: trust.changed ? 'Trust the new one' : 'Trust',
    danger: trust.changed,
  });
}

/** The form for a new connection. Gives it, or null. */
export async function addConnection() {
  const [{ protocols }, { profiles }] = await Promise.all([get('protocols'), get('profiles')]);
  const offered = protocols.filter((one) => !one.cloud);
  const kind = element('select', { onchange: showFields }, ...offered.map(
    ({ protocol, title }) => element('option', { value: protocol, textContent: title })));
  const fields = element('fieldset', { className: 'fields' });
  let controls = {};
  let result = null;

  function showFields() {
    const chosen = offered.find(({ protocol }) => protocol === kind.value);
    const rows = chosen.fields.map((one) => ({ one, row: field(one.label, makeControl(one)) }));
    controls = Object.fromEntries(rows.map(({ one, row }) => [one.name, row.control]));
    fields.replaceChildren(...rows.map(({ row }) => row));
  }

  function collect() {
    const values = Object.entries(controls)
      .filter(([, control]) => control.type !== 'number' || control.value !== '')
      .map(([name, control]) => [name, control.type === 'checkbox' ? control.checked
        : control.type === 'number' ? Number(control.value) : control.value]);
    return { protocol: kind.value, ...Object.fromEntries(values) };
  }

  const accounts = profiles.map(
    ({ id, title, account, alias }) => [`${title}: ${alias || account}`, id]);
  if (offered.length > 0) {
    showFields();
  }
  const body = [
    ...(accounts.length ? [paragraph('Saved accounts'), element('ul', { className: 'choices' },
      ...accounts.map(([text, id]) => element('li', {}, element('button', {
        type: 'button', textContent: text, onclick: (event) => event.target.form.accept(id) }))))] : []),
    ...(offered.length ? [field('Kind', kind), fields] : [])];
  const added = await ask({
    title: 'Add a connection',
    body,
    accept: offered.length ? 'Connect' : null,
    submit: async (value) => {
      const wanted = value === 'accept' ? collect() : { profile: value };
      result = await connectWith('add', wanted);
      return result;
    },
  });
  return added && result;
}

function makeControl(one) {
  return element('input', {
    type: one.type,
    required: Boolean(one.required),
    autocomplete: one.type === 'password' ? 'new-password' : 'off',
    autocapitalize: 'off',
    spellcheck: false,
    ...(one.type === 'number' && { min: 1, max: 65535 }),
    ...(one.type === 'checkbox' ? { checked: one.value === true } : { value: one.value ?? '' }),
  });
}
