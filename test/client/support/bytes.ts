// SPDX-License-Identifier: Apache-2.0
//
// Bytes as a test writes them.

/** From hexadecimal digits; blanks are for the reader. */
export const bytes = (hex: string) => Uint8Array.from(Buffer.from(hex.replaceAll(" ", ""), "hex"));
