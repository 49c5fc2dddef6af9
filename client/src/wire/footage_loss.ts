// SPDX-License-Identifier: Apache-2.0
//
// What a lower limit would delete, as the server tells it before it saves that limit.

export interface FootageLoss {
  events: number;
  bytes: number;
  /** Unix seconds; when the last of it ends. */
  until: number;
}

/** Nothing was saved. */
export interface Unconfirmed {
  confirm: FootageLoss;
}
