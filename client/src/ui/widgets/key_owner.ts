// SPDX-License-Identifier: Apache-2.0
//
// Whether a key belongs to the control that has the focus, or is free for the screen's shortcuts.
//
// Why so        A click leaves the focus on what was clicked. Whoever then presses Space means the picture, not the
//               button once more; whoever came to the button with Tab means the button.

const kNoText = /^(checkbox|radio|button|submit|reset|range|color|file|image)$/;
/** What works the controls that are no text fields. */
const kWorking: Record<string, RegExp> = {
  A: /^Enter$/,
  BUTTON: /^( |Enter)$/,
  SUMMARY: /^( |Enter)$/,
  INPUT: /^( |Arrow.*)$/,
  SELECT: /^( |Enter|Arrow.*|Page.*|Home|End)$/,
};

let isPointerLast = false;
let isFocusedByPointer = false;
addEventListener("pointerdown", () => (isPointerLast = true), true);
addEventListener("keydown", () => (isPointerLast = false), true);
addEventListener("focusin", () => (isFocusedByPointer = isPointerLast), true);

/** Whether it was a click or tap that brought the focus to where it is. */
export function hasFocusByPointer(): boolean {
  return isFocusedByPointer;
}

export function isForFocused({ target, key }: KeyboardEvent): boolean {
  if (!(target instanceof HTMLElement)) return false;
  const isText = target instanceof HTMLInputElement ? !kNoText.test(target.type) : target instanceof HTMLTextAreaElement;
  return isText || (!isFocusedByPointer && (kWorking[target.tagName]?.test(key) ?? false));
}
