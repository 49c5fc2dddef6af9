// SPDX-License-Identifier: Apache-2.0
//
// Makes a camera group where a camera is set up: all that it needs is a name.

import type { Named } from "../../../wire/camera_setup";
import { Groups } from "../../../wire/groups";
import type { Server } from "../../../wire/server";
import { textField } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";

/** The new group; null where the user would not. */
export async function askForGroup(host: HTMLElement, server: Server): Promise<Named | null> {
  const name = textField("Name", { maxlength: "64" });
  let made: Named | null = null;
  await openDialog(host, {
    title: "New group",
    content: [name.root],
    submit: "Add",
    attempt: async () => {
      const text = name.value.trim();
      if (!text) return "Please give the group a name.";
      made = await new Groups(server).add({ name: text, camera: [] });
    },
  });
  return made;
}
