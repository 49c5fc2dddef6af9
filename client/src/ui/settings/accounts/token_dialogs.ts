// SPDX-License-Identifier: Apache-2.0
//
// What is asked before an access token is added or removed; its secret is shown once.

import { kMarkKinds, type AccessToken, type AccessTokens, type MarkKind } from "../../../wire/access_tokens";
import type { Named } from "../../../wire/camera_setup";
import { element } from "../../widgets/dom";
import { chipsField, radioField, selectField, textField } from "../../widgets/fields";
import { openDialog, openReauthDialog } from "../../widgets/form_dialog";
import { copyable } from "../system/copyable";

export const kKindNames: Record<MarkKind, string> = { alert: "alerts", pos: "POS transactions" };

/** In days; 0: never. */
const kLifetimes = [
  ["0", "never"],
  ["30", "in 30 days"],
  ["90", "in 90 days"],
  ["365", "in a year"],
] as const;
const kDay = 86_400;

/** Resolves with whether it is added, once its secret is no longer shown. */
export async function askToAddToken(host: HTMLElement, tokens: AccessTokens, cameras: readonly Named[]): Promise<boolean> {
  const name = textField("Name", { maxlength: "64" }, "Such as that of the device, which then stands in what it reports.");
  const camera = chipsField("Cameras at which it may report", cameras);
  const kind = radioField<"both" | MarkKind>("May report", [["both", "both"], ["alert", "alerts"], ["pos", "POS transactions"]]);
  kind.value = "both";
  const expires = selectField("Expires", kLifetimes);
  let secret = "";
  const isAdded = await openReauthDialog(host, {
    title: "Add an access token",
    content: [name.root, camera.root, kind.root, expires.root],
    submit: "Add",
    attempt: async (password) => {
      if (!name.value.trim()) return "Please give the token a name.";
      if (camera.value.length === 0) return "Please choose a camera at which it may report.";
      const kinds = kind.value === "both" ? [...kMarkKinds] : [kind.value];
      const lifetime = Number(expires.value) * kDay;
      secret = await tokens.add({ name: name.value.trim(), camera: camera.value, kind: kinds, lifetime }, password);
    },
  });
  if (isAdded) await showSecret(host, name.value.trim(), secret);
  return isAdded;
}

function showSecret(host: HTMLElement, name: string, secret: string): Promise<boolean> {
  const hint = "It is shown only now. Whoever has it can report as this device: enter it there, and keep it nowhere else.";
  return openDialog(host, {
    title: `The token ${name}`,
    content: [copyable(secret), element("p", { class: "form-hint" }, hint)],
    submit: "",
    attempt: async () => undefined,
  });
}

export function askToRemoveToken(host: HTMLElement, tokens: AccessTokens, { id, name }: AccessToken): Promise<boolean> {
  return openDialog(host, {
    title: `Remove the token ${name}?`,
    content: [element("p", {}, "The device that has it can report no longer. What it has reported stays.")],
    submit: "Remove",
    attempt: async () => void (await tokens.remove(id)),
  });
}
