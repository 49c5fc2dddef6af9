// SPDX-License-Identifier: Apache-2.0
//
// Shows the code by which another host may show this one's cameras, and what else is to be typed there.

import type { Hosts } from "../../../wire/hosts";
import { secureAddress } from "../../../live/unplayable";
import { element } from "../../widgets/dom";
import { factList } from "../../widgets/fact_list";
import { textField } from "../../widgets/fields";
import { openDialog, openReauthDialog } from "../../widgets/form_dialog";
import { clockTime } from "../../widgets/text";
import { ownAddress } from "./host_text";

/** Resolves once the code is no longer shown. */
export async function showCode(host: HTMLElement, hosts: Hosts): Promise<void> {
  const name = textField("Name of the other host", { required: true, maxlength: "64" }, "What it is called here.");
  let made = null as { code: string; seconds: number } | null;
  const purpose =
    "With a code another host may show every camera of this one, live. Make one only for a host that you trust with that.";
  const isMade = await openReauthDialog(host, {
    title: "Show a code",
    content: [element("p", {}, purpose), name.root],
    submit: "Show the code",
    attempt: async (password) => void (made = await hosts.invite(name.value.trim(), password)),
  });
  if (!isMade || !made) return;
  const { code, seconds } = made;
  const until = clockTime(Date.now() + seconds * 1000);
  await openDialog(host, {
    title: `Code for ${name.value.trim()}`,
    content: [
      element("p", {}, "On the other host: Settings, Hosts, Add a host. There, enter:"),
      factList([
        ["Address", ownAddress(location) ?? "this host's name or address in your network"],
        ["Port", new URL(secureAddress()).port || "443"],
      ]),
      element("p", { class: "host-code", role: "group", "aria-label": "Code" }, ...groups(code)),
      element("p", { class: "form-hint" }, `Valid once, until ${until}, or until a newer code is shown.`),
    ],
    submit: "",
    attempt: async () => undefined,
  });
}

function groups(code: string): HTMLElement[] {
  return code.split("-").map((group) => element("span", {}, group));
}
