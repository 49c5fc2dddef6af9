// SPDX-License-Identifier: Apache-2.0
//
// The title of the page: what is shown, then the product.

let screen = "";

/** The title of a screen. */
export function titleScreen(name: string): void {
  screen = name;
  titleCover(null);
}

/** The title of what covers the screen; null: it is uncovered again. */
export function titleCover(name: string | null): void {
  document.title = `${name ?? screen} · Lookhaven`;
}
