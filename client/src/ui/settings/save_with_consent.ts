// SPDX-License-Identifier: Apache-2.0
//
// Saves retention limits. Nothing is deleted before the user has seen how much that is.

import type { Unconfirmed } from "../../wire/footage_loss";
import { bytesText, counted } from "../widgets/amounts";
import { element } from "../widgets/dom";
import { openDialog } from "../widgets/form_dialog";
import { minuteText } from "../widgets/text";

/** What `save` returns, asked again once the user has confirmed; null where the user would rather keep the footage. */
export async function saveWithConsent<Saved extends object>(
  host: HTMLElement,
  save: (confirm: boolean) => Promise<Saved | Unconfirmed>,
): Promise<Saved | null> {
  const answer = await save(false);
  if (!("confirm" in answer)) return answer;
  const { events, bytes, until } = answer.confirm;
  const what = `${counted(events, "event")} with ${bytesText(bytes)} of footage`;
  let saved: Saved | null = null;
  await openDialog(host, {
    title: "Delete footage?",
    content: [element("p", {}, `This would delete ${what}, up to ${minuteText(until * 1000)}.`)],
    submit: "Save and delete",
    attempt: async () => {
      const confirmed = await save(true);
      if (!("confirm" in confirmed)) saved = confirmed;
    },
  });
  return saved;
}
