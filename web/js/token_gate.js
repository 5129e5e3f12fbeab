// Asks for the access token. While the question is open the rest of the page
// is hidden; every request that needs a token waits for the same answer.

import { showControlProblem, showMessage } from './show_message.js';
import { forgetStoredToken, storeToken, storedToken } from './token_store.js';

// Why the token is asked for: the sentence, and its tone.
const REASONS = {
  missing: ['', ''],
  refused: ['The device did not accept this access token. Enter it again.', 'error'],
  forgotten: ['The access token was forgotten. Enter it to go on.', ''],
};

// A token goes into an HTTP header, which carries visible ASCII only.
function tokenProblem(token) {
  if (token === '') return 'Enter the access token.';
  if (!/^[\x21-\x7e]+$/.test(token)) {
    return 'An access token holds only letters, digits and punctuation, without spaces.';
  }
  return '';
}

export class TokenGate {
  // `elements`: gate (section), form, input, reason (text), app (the page
  // hidden while asking), forgetButton.
  constructor(elements) {
    this.elements = elements;
    this.token = storedToken();
    this.pending = null;
    this.resolvePending = null;
    this.focusBefore = null;

    elements.form.addEventListener('submit', (event) => {
      event.preventDefault();
      this.accept();
    });
    this.setAsking(this.token === '');
  }

  // Shows the question with the page hidden, or the page without it.
  setAsking(asking) {
    const { gate, app, forgetButton } = this.elements;
    gate.hidden = !asking;
    app.hidden = asking;
    forgetButton.hidden = asking;
  }

  current() {
    return this.token;
  }

  // Resolves with a token to try. `staleToken` is the one the device refused:
  // when another request already replaced it, the new one is returned at once.
  request(reason, staleToken = null) {
    if (staleToken !== null && this.token !== '' && this.token !== staleToken) {
      return Promise.resolve(this.token);
    }
    if (reason !== 'missing') {
      this.token = '';
      forgetStoredToken();
    }
    if (this.pending === null) {
      this.pending = new Promise((resolve) => {
        this.resolvePending = resolve;
      });
    }
    this.show(reason);
    return this.pending;
  }

  // Drops the token and asks for one again; resolves with the new one.
  forget() {
    return this.request('forgotten');
  }

  show(reason) {
    const { gate, input, reason: reasonText } = this.elements;
    if (gate.hidden) this.focusBefore = document.activeElement;
    showMessage(reasonText, ...REASONS[reason]);
    this.setAsking(true);
    input.value = '';
    input.removeAttribute('aria-invalid');
    input.focus();
  }

  accept() {
    const { input, reason } = this.elements;
    const token = input.value.trim();
    const problem = tokenProblem(token);
    if (problem !== '') {
      showControlProblem(reason, input, problem);
      return;
    }
    this.token = token;
    storeToken(token);
    input.value = '';
    this.setAsking(false);
    this.restoreFocus();
    const resolve = this.resolvePending;
    this.pending = null;
    this.resolvePending = null;
    if (resolve !== null) resolve(token);
  }

  // Puts the keyboard focus back where it was before the question, or on the
  // page itself when that element is gone or hidden.
  restoreFocus() {
    const before = this.focusBefore;
    this.focusBefore = null;
    if (before && before !== document.body && before.isConnected &&
        before.offsetParent !== null && !before.matches(':disabled')) {
      before.focus();
    } else {
      this.elements.app.focus();
    }
  }
}
