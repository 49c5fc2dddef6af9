// SPDX-License-Identifier: Apache-2.0
//
// Whether a key belongs to the control that has the focus, or is free for the screen's shortcuts.
//
// Why so        A click leaves the focus on what was clicked. A user who then presses Space means the picture, not the
//               button once more; one who came to the button with Tab means the button. A dialog gives the focus back
//               to where it was, and whether a click or a key brought it there stays as it was.

const kNoText = /^(checkbox|radio|button|submit|reset|range|color|file|image)$/;
/** The keys that operate the controls that are no text fields. */
const kOperating: Record<string, RegExp> = {
  A: /^Enter$/,
  BUTTON: /^( |Enter)$/,
  SUMMARY: /^( |Enter)$/,
  INPUT: /^( |Arrow.*)$/,
  SELECT: /^( |Enter|Arrow.*|Page.*|Home|End)$/,
};

let isPointerLast = false;
let wasInDialog = false;
const focusedByPointer = new WeakSet<EventTarget>();

function noteInput(byPointer: boolean): void {
  isPointerLast = byPointer;
  wasInDialog = isInDialog(document.activeElement);
}

/** Firefox sends no focusin where a dialog gives the focus back. */
function noteFocus(focused: EventTarget): void {
  if (wasInDialog && !isInDialog(focused)) return;
  if (isPointerLast) focusedByPointer.add(focused);
  else focusedByPointer.delete(focused);
}

function isInDialog(focused: EventTarget | null): boolean {
  return focused instanceof Element && focused.closest("dialog") !== null;
}

addEventListener("pointerdown", () => noteInput(true), true);
addEventListener("keydown", () => noteInput(false), true);
addEventListener("focusin", ({ target }) => noteFocus(target!), true);

/** Whether it was a click or tap that brought the focus to where it is. */
export function hasFocusByPointer(): boolean {
  return document.activeElement !== null && focusedByPointer.has(document.activeElement);
}

export function isForFocused({ target, key }: KeyboardEvent): boolean {
  if (!(target instanceof HTMLElement)) return false;
  const isText = target instanceof HTMLInputElement ? !kNoText.test(target.type) : target instanceof HTMLTextAreaElement;
  return isText || (!focusedByPointer.has(target) && (kOperating[target.tagName]?.test(key) ?? false));
}
