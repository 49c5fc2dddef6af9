// SPDX-License-Identifier: Apache-2.0
//
// Undo, redo, and whether there is anything to save. Each step is a whole state, which is never modified.

const kMaxSteps = 200;

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

  /** Steps that were undone cannot be redone after this. */
  add(state: State): void {
    this.#steps = [...this.#steps.slice(0, this.#at + 1), state].slice(-kMaxSteps);
    this.#at = this.#steps.length - 1;
  }

  undo(): void {
    if (this.canUndo) this.#at -= 1;
  }

  redo(): void {
    if (this.canRedo) this.#at += 1;
  }

  /** The server has this state now. */
  markSaved(state: State): void {
    this.#saved = state;
  }
}
