// SPDX-License-Identifier: Apache-2.0
//
// Asks before a camera is removed, and what shall become of its footage.

import type { CameraSetup } from "../../../wire/camera_setup";
import { asServerError } from "../../../wire/server";
import { bytesText, counted } from "../../widgets/amounts";
import { whileBusy } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { radioField } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { minuteText } from "../../widgets/text";

/**
 * Whether it is removed. What it has is asked for again, so that the user decides on what is there now; `pressed` is
 * busy until that is known.
 */
export async function askToRemove(
  host: HTMLElement,
  setup: CameraSetup,
  id: number,
  pressed: HTMLButtonElement,
): Promise<boolean> {
  const asked = setup.list({ footage: true }).catch((error: unknown) => void notify(asServerError(error).message));
  const list = await whileBusy(pressed, asked);
  const camera = list?.camera.find((one) => one.id === id);
  if (!camera) return list !== undefined;
  const { events, bytes, oldest } = camera.footage ?? { events: 0, bytes: 0, oldest: null };
  const since = oldest ? `, since ${minuteText(oldest * 1000)}` : "";
  const some = `It has ${counted(events, "event")} with ${bytesText(bytes)} of footage${since}.`;
  const has = events > 0 ? some : "It has no footage.";
  const footage = radioField<"keep" | "remove">("Its footage", [
    ["keep", "Leave it on the disk"],
    ["remove", "Delete it too"],
  ]);
  const hint =
    "Footage that is left is deleted once it exceeds the limits of its mount. Kept recordings stay in either case.";
  footage.value = "keep";
  footage.root.hidden = events === 0;
  const removed = await openDialog(host, {
    title: `Remove ${camera.name}?`,
    content: [element("p", {}, has), footage.root, element("p", { class: "form-hint" }, hint)],
    submit: "Remove",
    attempt: async () => void (await setup.remove(camera, footage.value)),
  });
  if (removed) notify(`${camera.name} is removed.`);
  return removed;
}
