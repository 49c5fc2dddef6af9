// SPDX-License-Identifier: Apache-2.0
//
// The code by which two hosts are paired, as the server has it (standalone/remote/pairing_code.h): 32 digits of base
// 32, of which the last 16 bits are a checksum.

const kDigits = "0123456789ABCDEFGHJKMNPQRSTVWXYZ";
const kLength = 32;

/** What is wrong with a code as it was typed, as a sentence; empty where nothing is. */
export function codeProblem(typed: string): string {
  const text = typed.toUpperCase().replaceAll(/[\s-]/g, "").replaceAll("O", "0").replaceAll(/[IL]/g, "1");
  const values = [...text].map((digit) => kDigits.indexOf(digit));
  if (text === "") return "Please enter the code that the other host shows.";
  if (values.includes(-1)) return "The code has a typing error: it has digits and letters only, and no U.";
  if (values.length < kLength) return "The code is not complete: it has eight groups of four digits and letters.";
  if (values.length > kLength) return "The code is too long: it has eight groups of four digits and letters.";
  return checksum(values) === 0 ? "" : "The code has a typing error. Please compare it with the one that the other host shows.";
}

/** CRC-16 of five bits each; 0 where its own value is at the end. */
function checksum(values: readonly number[]): number {
  let crc = 0xffff;
  for (const value of values) {
    for (let bit = 4; bit >= 0; bit -= 1) {
      const carry = (crc >> 15) ^ ((value >> bit) & 1);
      crc = ((crc << 1) & 0xffff) ^ (carry ? 0x1021 : 0);
    }
  }
  return crc;
}
