// SPDX-License-Identifier: Apache-2.0
//
// What of a form outlives it.

/** What a form held when it was closed, and the record that it was made from. Passwords are not kept. */
export interface Draft {
  settings: unknown;
  base: unknown;
}
