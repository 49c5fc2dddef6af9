// SPDX-License-Identifier: Apache-2.0
//
// How many new events there are, in words.

import type { News } from "../../wire/alerts";

/** "3 new since you looked"; "" where there is nothing new. */
export function newsText({ count, mayBeMore }: News): string {
  if (count === 0) return mayBeMore ? "There may be new events since you looked" : "";
  return `${count}${mayBeMore ? " or more" : ""} new since you looked`;
}
