// SPDX-License-Identifier: Apache-2.0
//
// Asks for the address of another host and the code that it shows, and adds it.

import type { HostRecord, Hosts } from "../../../wire/hosts";
import { codeProblem } from "../../../wire/pairing_code";
import { element } from "../../widgets/dom";
import { numberField, textField } from "../../widgets/fields";
import { openReauthDialog } from "../../widgets/form_dialog";
import { hostAndPort } from "./host_text";

/** `onAdded` is called once the host is added, even where the dialog was closed before. */
export async function addHost(host: HTMLElement, hosts: Hosts, onAdded: (added: HostRecord) => void): Promise<void> {
  const name = textField("Name", { required: true, maxlength: "64" }, "What the other host is called here.");
  const address = textField("Address", { required: true, maxlength: "300", inputmode: "url" }, "Its name or IP address.");
  const port = numberField("Port", 1, 65_535, "8443, unless the other host shows another.");
  const code = textField("Code", { class: "input host-code-input", maxlength: "100", autocapitalize: "characters" });
  port.value = 8443;
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
      onAdded(await hosts.pair({ name: name.value.trim(), ...where, code: code.value, reauth }));
      return undefined;
    },
  });
}
