// SPDX-License-Identifier: Apache-2.0
//
// Asks before a pairing is ended, and says what goes with it.

import type { HostLoss, HostRecord, Hosts } from "../../../wire/hosts";
import { counted } from "../../widgets/amounts";
import { element } from "../../widgets/dom";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { denialsText } from "./host_text";

/** Whether it is removed. */
export async function askToRemoveHost(host: HTMLElement, hosts: Hosts, record: HostRecord): Promise<boolean> {
  const rights = element("p", {}, rightsSentence(record));
  let isConfirmed = record.denial.length > 0;
  const removed = await openDialog(host, {
    title: `Remove ${record.name}?`,
    content: [element("p", {}, consequence(record)), rights],
    submit: "Remove",
    attempt: async () => {
      const answer = await hosts.remove(record, isConfirmed);
      if ("removed" in answer) return undefined;
      // Somebody denied something while the dialog was open.
      rights.textContent = rightsSentence(answer.confirm);
      isConfirmed = true;
      return "What goes with it has changed. Please read it again.";
    },
  });
  if (removed) notify(`${record.name} is removed.`);
  return removed;
}

function consequence({ address, camera }: HostRecord): string {
  if (!address) return "It can show no camera of this host any more. Streams that it shows end at once.";
  const cameras = camera.length === 1 ? "Its camera is" : `Its ${counted(camera.length, "camera")} are`;
  return `${cameras} not shown here any more, on e-maps neither. Nothing changes on the paired host.`;
}

function rightsSentence(loss: HostLoss): string {
  if (loss.denial.length === 0) return "";
  return `What users are denied of it goes, too; once it is added again, everybody sees all of it: ${denialsText(loss)}.`;
}
