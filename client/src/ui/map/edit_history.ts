// SPDX-License-Identifier: Apache-2.0
//
// The steps of an editor: back, forth, and whether there is anything to save. A step is a whole state, never changed.

const kMostSteps = 200;

export class EditHistory<State> {
  #steps: State[];
  #at = 0;
  #saved: State;

  constructor(first: State) {
    this.#steps = [first];
    this.#saved = first;
  }

  get current(): State {
    return this.#steps[this.#at]!;
  }

  get isChanged(): boolean {
    return this.current !== this.#saved;
  }

  get canUndo(): boolean {
    return this.#at > 0;
  }

  get canRedo(): boolean {
    return this.#at + 1 < this.#steps.length;
  }

  /** What was undone before cannot be redone any more. */
  add(state: State): void {
    this.#steps = [...this.#steps.slice(0, this.#at + 1), state].slice(-kMostSteps);
    this.#at = this.#steps.length - 1;
  }

  undo(): void {
    if (this.canUndo) this.#at -= 1;
  }

  redo(): void {
    if (this.canRedo) this.#at += 1;
  }

  /** `state` is what the server has from now on. */
  markSaved(state: State): void {
    this.#saved = state;
  }
}
