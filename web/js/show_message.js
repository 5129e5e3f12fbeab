// The one way the page tells an outcome: a message line (class "message")
// with its tone in data-tone, which the style sheet colours, and the control
// at fault marked aria-invalid. Every form and the table use these two.

// Shows `text` in `element` with `tone` ('error', 'success', 'busy'); no
// tone leaves it plain, and an empty text hides the line.
export function showMessage(element, text, tone = '') {
  element.textContent = text;
  if (tone === '') delete element.dataset.tone;
  else element.dataset.tone = tone;
}

// Tells `problem` in `message`, marks `control` as the cause until it is
// edited, and moves the keyboard focus to it.
export function showControlProblem(message, control, problem) {
  showMessage(message, problem, 'error');
  control.setAttribute('aria-invalid', 'true');
  control.addEventListener('input', () => control.removeAttribute('aria-invalid'), { once: true });
  control.focus();
}
