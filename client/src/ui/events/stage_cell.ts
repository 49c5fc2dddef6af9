// SPDX-License-Identifier: Apache-2.0
//
// A cell of the stage without a camera, in which the user chooses one.

import type { Camera } from "../../wire/camera";
import { element } from "../widgets/dom";

/** `cameras`: those that may be chosen. `full` says why none may; empty where one may. */
export function emptyCell(cameras: readonly Camera[], full: string, chosen: (camera: number) => void): HTMLElement {
  if (full || cameras.length === 0) return element("div", { class: "stage-cell" }, element("p", {}, full || "No other cameras"));
  const first = element("option", { value: "" }, "+ Camera");
  const options = cameras.map(({ id, name }) => element("option", { value: String(id) }, name));
  const select = element("select", { class: "input", "aria-label": "Add a camera" }, first, ...options);
  select.addEventListener("change", () => select.value && chosen(Number(select.value)));
  return element("div", { class: "stage-cell" }, select);
}
