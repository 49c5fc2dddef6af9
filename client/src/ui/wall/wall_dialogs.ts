// SPDX-License-Identifier: Apache-2.0
//
// The dialogs in which layouts and sequences are saved, changed and deleted.

import type { Camera } from "../../wire/camera";
import { element } from "../widgets/dom";
import { chipsField, numberField, textField } from "../widgets/fields";
import { openDialog } from "../widgets/form_dialog";
import { orderHandle } from "../widgets/order_list";
import { kLayoutLabels } from "./layout_picker";
import { kMaxDwellS, kMaxNameLength, kMinDwellS } from "./saved_layouts";
import type { SavedKind, SavedLayout, SavedLayouts, Sequence } from "./saved_layouts";

const kName = { maxlength: String(kMaxNameLength) };

/** "4 cameras · two by two". */
export function layoutInWords({ grid, cameras }: SavedLayout): string {
  return `${cameras.length} ${cameras.length === 1 ? "camera" : "cameras"} · ${kLayoutLabels[grid][1].toLowerCase()}`;
}

/** "3 layouts · 15 s each". */
export function sequenceInWords({ layouts, dwellS }: Sequence): string {
  return `${layouts.length} ${layouts.length === 1 ? "layout" : "layouts"} · ${dwellS} s each`;
}

/** The cameras of a layout once these are ticked of the known ones: others keep their places, new ones come last. */
export function chosenCameras(before: readonly number[], known: readonly number[], ticked: number[]): number[] {
  const stay = before.filter((id) => ticked.includes(id) || !known.includes(id));
  return [...stay, ...known.filter((id) => ticked.includes(id) && !before.includes(id))];
}

/** `cameras` are all of the account, in the order in which new ones are added. Resolves with whether it was saved. */
export function askForLayout(
  host: HTMLElement,
  saved: SavedLayouts,
  layout: SavedLayout,
  cameras: readonly Camera[],
): Promise<boolean> {
  const name = textField("Name", kName);
  const chips = chipsField("Cameras", cameras);
  name.value = layout.name;
  chips.value = [...layout.cameras];
  return openDialog(host, {
    title: layout.name ? `Change ${layout.name}` : "Save the layout",
    content: [name.root, chips.root],
    submit: "Save",
    attempt: async () => {
      const text = name.value.trim();
      const problem = saved.nameProblem("layout", text, layout.id);
      if (problem) return problem;
      const ids = chosenCameras(layout.cameras, cameras.map((one) => one.id), chips.value);
      if (ids.length === 0) return "Please tick at least one camera.";
      await saved.saveLayout({ ...layout, name: text, cameras: ids });
      return undefined;
    },
  });
}

/** The names of layouts, each with a handle that moves it and a box that takes it into the sequence. */
function orderedLayouts(all: readonly SavedLayout[], chosen: readonly string[]) {
  const list = element("ul", { class: "sequence-layouts" });
  const place = ({ id }: SavedLayout) => (chosen.includes(id) ? chosen.indexOf(id) : chosen.length);
  for (const layout of [...all].sort((one, other) => place(one) - place(other))) {
    const { id, name } = layout;
    const box = element("input", { type: "checkbox", value: id, checked: chosen.includes(id) });
    const item = element("li", {}, element("label", {}, box, element("span", {}, name)));
    item.prepend(orderHandle(list, item, name, () => undefined));
    list.append(item);
  }
  const root = element("fieldset", { class: "form-choice" }, element("legend", {}, "Layouts, in this order"), list);
  const ticked = () => [...list.querySelectorAll("input")].filter((box) => box.checked).map(({ value }) => value);
  return { root, ticked };
}

/** A new one where it has no name. Resolves with whether it was saved. */
export function askForSequence(host: HTMLElement, saved: SavedLayouts, sequence: Sequence): Promise<boolean> {
  const name = textField("Name", kName);
  const dwell = numberField("Seconds for each layout", kMinDwellS, kMaxDwellS);
  const layouts = orderedLayouts(saved.layouts, sequence.layouts);
  name.value = sequence.name;
  dwell.value = sequence.dwellS;
  return openDialog(host, {
    title: sequence.name ? `Change ${sequence.name}` : "New sequence",
    content: [name.root, dwell.root, layouts.root],
    submit: "Save",
    attempt: async () => {
      const text = name.value.trim();
      const problem = saved.nameProblem("sequence", text, sequence.id);
      if (problem) return problem;
      const dwellS = dwell.value;
      if (dwellS === null || dwellS < kMinDwellS || dwellS > kMaxDwellS) {
        return `A layout is shown for ${kMinDwellS} to ${kMaxDwellS} seconds.`;
      }
      const chosen = layouts.ticked();
      if (chosen.length === 0) return "Please tick at least one layout.";
      await saved.saveSequence({ id: sequence.id, name: text, dwellS, layouts: chosen });
      return undefined;
    },
  });
}

export function askToOverwrite(host: HTMLElement, saved: SavedLayouts, before: SavedLayout, now: SavedLayout) {
  const sentence = `It is replaced by what the wall shows now: ${layoutInWords(now)}. Until now: ${layoutInWords(before)}.`;
  return openDialog(host, {
    title: `Overwrite ${before.name}?`,
    content: [element("p", { class: "form-hint" }, sentence)],
    submit: "Overwrite",
    attempt: () => saved.saveLayout(now),
  });
}

export function askToDelete(host: HTMLElement, saved: SavedLayouts, kind: SavedKind, one: SavedLayout | Sequence) {
  const { id, name } = one;
  const losing = kind === "layout" ? saved.sequences.filter(({ layouts }) => layouts.includes(id)) : [];
  const names = losing.map((sequence) => sequence.name).join(", ");
  const sentence = names ? `It is removed from the sequences that have it: ${names}.` : `The ${kind} cannot be restored.`;
  return openDialog(host, {
    title: `Delete ${name}?`,
    content: [element("p", { class: "form-hint" }, sentence)],
    submit: "Delete",
    attempt: () => saved.remove(kind, id),
  });
}
