// SPDX-License-Identifier: Apache-2.0
//
// What is asked of the name and the password of an account before the server is, which asks the same of them.

const kName = /^[A-Za-z0-9][A-Za-z0-9._@-]{0,63}$/;
const kMinPasswordBytes = 8;

/** A sentence where an account cannot have this name. */
export function accountNameProblem(name: string): string {
  const rule = "A name has up to 64 letters, digits and . _ @ -, and begins with a letter or digit.";
  return kName.test(name) ? "" : rule;
}

/** A sentence where a new password that was typed twice cannot be taken. */
export function passwordProblem(password: string, again: string): string {
  const isShort = new TextEncoder().encode(password).length < kMinPasswordBytes;
  if (isShort) return `A password has at least ${kMinPasswordBytes} characters.`;
  return password === again ? "" : "The two new passwords are not the same.";
}
