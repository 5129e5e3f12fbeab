// Tells beside a validity field why a server certificate should not be
// valid for longer than Apple's clients accept.

import { showMessage } from './show_message.js';

export const LONGEST_SERVER_DAYS = 825;

// Keeps `note` telling why, while `input` asks for more than 825 days.
export function bindServerDaysNote(input, note) {
  const update = () => {
    const tooLong = Number(input.value) > LONGEST_SERVER_DAYS;
    showMessage(note, tooLong ? 'Safari and iOS refuse a server certificate valid for more ' +
      `than ${LONGEST_SERVER_DAYS} days; other clients accept it.` : '', tooLong ? 'warning' : '');
  };
  input.addEventListener('input', update);
  update();
}
