// SPDX-License-Identifier: Apache-2.0
//
// A code that pairs two hosts: what was typed wrongly is told at once, as the server would.

import { codeProblem } from "../../../client/src/wire/pairing_code";
import { kCode } from "../support/fake_setup";

test.each([
  [kCode, ""],
  [" oo8j 4ct4ank7f24so4hmasw9 nf6y-z93n", ""],
  ["", "enter the code"],
  [kCode.slice(0, -1), "not complete"],
  [`${kCode}0`, "too long"],
  [kCode.replace("Z", "U"), "no U"],
  [kCode.replace("Z", "Ä"), "no U"],
])("%s: %s", (typed, problem) => {
  if (problem) expect(codeProblem(typed)).toContain(problem);
  else expect(codeProblem(typed)).toBe("");
});

test("every wrong digit is detected, and any two neighbours that were swapped", () => {
  const plain = kCode.replaceAll("-", "");
  for (let at = 0; at < plain.length; at += 1) {
    for (const digit of "0123456789ABCDEFGHJKMNPQRSTVWXYZ") {
      const typed = plain.slice(0, at) + digit + plain.slice(at + 1);
      expect(codeProblem(typed) === "", typed).toBe(typed === plain);
    }
    const swapped = plain.slice(0, at) + (plain[at + 1] ?? "") + plain[at]! + plain.slice(at + 2);
    expect(codeProblem(swapped) === "", swapped).toBe(swapped === plain);
  }
});
