// SPDX-License-Identifier: Apache-2.0
// Short words for the document. Texts go in as texts, never as markup.

export const byId = (id) => document.getElementById(id);

/** An element with its properties, `text` and children. */
export function make(tag, { text, data, ...properties } = {}, ...children) {
  const element = Object.assign(document.createElement(tag), properties);
  if (text !== undefined) element.textContent = text;
  Object.assign(element.dataset, data);
  element.append(...children);
  return element;
}

/** Sets a text only where it differs. */
export function say(element, text) {
  if (element.textContent !== text) element.textContent = text;
}

export function press(button, isPressed) {
  button.setAttribute('aria-pressed', String(isPressed));
}

/** Buttons with a value each, of which some are pressed. */
export class Choice {
  constructor(element, onChoose) {
    this.buttons = [...element.querySelectorAll('button')];
    for (const button of this.buttons) button.addEventListener('click', () => onChoose(button.dataset.value));
  }

  press(values) {
    for (const button of this.buttons) press(button, values.includes(button.dataset.value));
  }

  enable(isAllowed, reason) {
    for (const button of this.buttons) {
      button.disabled = !isAllowed(button.dataset.value);
      if (button.disabled) button.title = reason;
    }
  }
}
