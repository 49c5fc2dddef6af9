// SPDX-License-Identifier: Apache-2.0
//
// Does a piece of work at most once for each picture of the screen, however often it is requested.

export class OncePerFrame {
  readonly #work: () => void;
  #animationFrame = 0;

  constructor(work: () => void) {
    this.#work = work;
  }

  request(): void {
    this.#animationFrame ||= requestAnimationFrame(() => {
      this.#animationFrame = 0;
      this.#work();
    });
  }

  cancel(): void {
    cancelAnimationFrame(this.#animationFrame);
    this.#animationFrame = 0;
  }
}
