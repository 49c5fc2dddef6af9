// SPDX-License-Identifier: Apache-2.0
//
// Says why still pictures are shown in place of a stream, and what the user can do about it.

import type { Unplayable } from "../../live/unplayable";
import { element } from "../widgets/dom";

/** With a link to the remedy, if there is one. */
export function unplayableHint({ reason, remedy }: Unplayable): (Node | string)[] {
  const sentence = `${reason}: still pictures`;
  return remedy ? [`${sentence}. `, element("a", { href: remedy.address }, remedy.label)] : [sentence];
}
