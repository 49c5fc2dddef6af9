// SPDX-License-Identifier: Apache-2.0
//
// Words and messages, which begin without a capital, as headings and sentences.

export function capitalized(text: string): string {
  return text.charAt(0).toUpperCase() + text.slice(1);
}

/** "try again in a moment": "Try again in a moment." */
export function sentenceOf(words: string): string {
  return `${capitalized(words).replace(/\.$/, "")}.`;
}
