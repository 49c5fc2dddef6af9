// SPDX-License-Identifier: Apache-2.0
//
// What is kept of a form that was closed.

/** What a form held when it was closed, and the record that it was made from. Passwords are not kept. */
export interface Draft {
  settings: unknown;
  base: unknown;
}
