// SPDX-License-Identifier: Apache-2.0
//
// The server's messages, which begin without a capital, as sentences.

export function capitalized(text: string): string {
  return text.charAt(0).toUpperCase() + text.slice(1);
}

/** "try again in a moment": "Try again in a moment." */
export function sentenceOf(words: string): string {
  return `${capitalized(words).replace(/\.$/, "")}.`;
}
