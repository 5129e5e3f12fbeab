// Runs one action form: checks its fields, locks it while the device works
// (so that it cannot be sent twice), and shows the outcome next to it.

import { domainsProblem } from './acme.js';
import { aliasProblem } from './aliases.js';
import { describeError } from './messages.js';
import { showControlProblem, showMessage } from './show_message.js';

// Checks that the browser cannot make, named by a control's data-check.
const CUSTOM_CHECKS = { aliases: aliasProblem, domains: domainsProblem };

// A failure of one step of an action, told with a sentence of its own before
// the error's (for example "The request was made, but its download failed.").
export class StepFailure extends Error {
  constructor(cause, context, lead) {
    super(lead, { cause });
    this.name = 'StepFailure';
    this.context = context;
  }
}

function labelText(control) {
  const label = control.labels?.[0];
  return label ? label.textContent.replace(/\s*\(.*\)\s*$/, '').trim() : control.name;
}

// The sentence that tells what is wrong with one control, or ''.
function controlProblem(control) {
  const custom = CUSTOM_CHECKS[control.dataset?.check]?.(control.value) ?? '';
  if (custom !== '') return custom;
  if (!control.willValidate || control.checkValidity()) return '';
  const label = labelText(control);
  const validity = control.validity;
  if (validity.valueMissing) {
    if (control.type === 'checkbox') return `Tick “${label}” to go on.`;
    return control.type === 'file' ? `Choose a file for “${label}”.` : `Fill in “${label}”.`;
  }
  if (control.name.endsWith('country')) return `“${label}”: enter a two-letter country code, such as DE or US.`;
  if (control.type === 'url') return `“${label}”: enter an address that starts with https://.`;
  if (validity.typeMismatch && control.type === 'email') {
    return `“${label}”: enter an e-mail address such as admin@example.com, or leave it empty.`;
  }
  if (validity.rangeUnderflow || validity.rangeOverflow || validity.stepMismatch ||
      validity.badInput) {
    return `“${label}”: enter a whole number from ${control.min} to ${control.max}.`;
  }
  return `“${label}”: ${control.validationMessage}`;
}

function explain(error, context) {
  if (error instanceof StepFailure) {
    return `${error.message} ${describeError(error.cause, error.context)}`;
  }
  return describeError(error, context);
}

function setBusy(form, busy, button, idleLabel) {
  form.setAttribute('aria-busy', String(busy));
  for (const control of form.elements) {
    if (control === button) continue;
    if (control instanceof HTMLFieldSetElement) continue;
    control.disabled = busy;
  }
  // The button stays focusable so that the keyboard focus is not lost; it
  // only says that it is busy.
  button.setAttribute('aria-disabled', String(busy));
  button.textContent = busy ? 'Working…' : idleLabel;
}

// Binds `form` to `run(values, form)`, which does the work with the form's values
// (a FormData taken before the form is locked) and resolves with { text },
// the success to tell; whatever it throws is shown as an error sentence.
// `busyText` tells what the device is doing while the form is locked.
export function bindActionForm(form, run, busyText) {
  const context = form.dataset.action;
  const message = form.querySelector('[data-message]');
  const button = form.querySelector('button[type="submit"]');
  const idleLabel = button.textContent;
  let busy = false;

  form.addEventListener('submit', async (event) => {
    event.preventDefault();
    if (busy) return;

    for (const control of form.elements) {
      const problem = controlProblem(control);
      if (problem !== '') {
        showControlProblem(message, control, problem);
        return;
      }
    }

    busy = true;
    const values = new FormData(form);
    setBusy(form, true, button, idleLabel);
    showMessage(message, busyText, 'busy');
    try {
      const outcome = await run(values, form);
      showMessage(message, outcome.text, 'success');
    } catch (error) {
      showMessage(message, explain(error, context), 'error');
    } finally {
      busy = false;
      setBusy(form, false, button, idleLabel);
    }
  });
}
