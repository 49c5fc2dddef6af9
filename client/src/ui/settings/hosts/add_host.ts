// SPDX-License-Identifier: Apache-2.0
//
// Asks for the address of another host and the code that it shows, and adds it.

import type { HostLoss, HostRecord, Hosts } from "../../../wire/hosts";
import { codeProblem } from "../../../wire/pairing_code";
import { element } from "../../widgets/dom";
import { numberField, textField } from "../../widgets/fields";
import { openReauthDialog } from "../../widgets/form_dialog";
import { denialsText, hostAndPort } from "./host_text";

/** `onAdded` is called once the host is added, even where the dialog was closed before. */
export async function addHost(host: HTMLElement, hosts: Hosts, onAdded: (added: HostRecord) => void): Promise<void> {
  const name = textField("Name", { required: true, maxlength: "64" }, "What the other host is called here.");
  const address = textField("Address", { required: true, maxlength: "300", inputmode: "url" }, "Its name or IP address.");
  const port = numberField("Port", 1, 65_535, "8443, unless the other host shows another.");
  const code = textField("Code", { class: "input host-code-input", maxlength: "100", autocapitalize: "characters" });
  port.value = 8443;
  // For which name it was asked whether another host's place is to be taken.
  let confirmedName = "";
  const how = "The other host shows a code to its managers: Settings, Hosts, Show a code.";
  await openReauthDialog(host, {
    title: "Add a host",
    content: [element("p", {}, how), name.root, address.root, port.root, code.root],
    submit: "Add the host",
    attempt: async (reauth) => {
      const problem = codeProblem(code.value);
      if (problem) {
        code.input.focus();
        return problem;
      }
      const where = hostAndPort(address.value, port.value);
      const wanted = name.value.trim();
      const confirm = wanted === confirmedName;
      const answer = await hosts.pair({ name: wanted, ...where, code: code.value, reauth, confirm });
      if ("server" in answer) return onAdded(answer.server);
      confirmedName = wanted;
      return replaceSentence(wanted, answer.confirm);
    },
  });
}

function replaceSentence(name: string, loss: HostLoss): string {
  const denied = denialsText(loss);
  return `A host called ${name} is known with another certificate. What users are denied of it would hold for this one: ${denied}. Add it all the same, or give it another name.`;
}
