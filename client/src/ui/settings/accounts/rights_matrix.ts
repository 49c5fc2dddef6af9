// SPDX-License-Identifier: Apache-2.0
//
// What an account may do, as ticks: groups and cameras by live, sound, playback, export; doors, I/O modules and maps.
//
// Why so        What is stored is what is denied, so that a new camera is seen by everyone who is not kept from it. A
//               group that is denied covers its cameras: their own ticks stay as they are and are shown without effect;
//               so is the one for export without the one for playback.

import { byRight, kCameraRights, type CameraRight, type Denied, type UserList } from "../../../wire/accounts";
import { element } from "../../widgets/dom";
import { chipsField, type Field } from "../../widgets/fields";
import { scrolled } from "../../widgets/table";
import { kNothingDenied, kRightNames, ordered } from "./rights";

type OtherKind = "emap" | "door" | "ioModule";

interface Row {
  kind: "camera" | "group";
  id: number;
  root: HTMLTableRowElement;
  boxes: Record<CameraRight, HTMLInputElement>;
}

export class RightsMatrix implements Field<Denied> {
  readonly root = element("div", { class: "form-group" });
  readonly #list: UserList;
  readonly #rows: Row[];
  readonly #all: Record<CameraRight, HTMLInputElement>;
  readonly #others: Record<OtherKind, Field<number[]>>;
  /** Holds what the form does not show, such as cameras that are gone. */
  #shown = kNothingDenied;

  constructor(list: UserList) {
    this.#list = list;
    this.#all = this.#boxes((right) => `All cameras: ${kRightNames[right]}`);
    const rows = (kind: Row["kind"], items: readonly { id: number; name: string }[]) =>
      items.map(({ id, name }) => this.#row(kind, id, name));
    const cameras = list.camera.map(({ id, name, server }) => ({ id, name: server ? `${name} (${server})` : name }));
    this.#rows = [...rows("group", list.group), ...rows("camera", cameras)];
    this.#others = {
      emap: chipsField("Maps", list.emap),
      door: chipsField("Doors", list.door),
      ioModule: chipsField("I/O modules", list.ioModule),
    };
    const head = (text: string) => element("th", { scope: "col" }, text);
    const all = element("tr", { class: "rights-all" }, element("th", { scope: "row" }, "All cameras"), ...this.#cells(this.#all));
    const table = element(
      "table",
      { class: "rights" },
      element("thead", {}, element("tr", {}, head("Camera"), ...kCameraRights.map((right) => head(kRightNames[right])))),
      element("tbody", {}, all, ...this.#rows.map(({ root }) => root)),
    );
    this.root.append(scrolled("Rights to cameras", table));
    for (const [name, field] of Object.entries(this.#others)) {
      field.root.hidden = list[name as OtherKind].length === 0;
      this.root.append(field.root);
    }
    table.addEventListener("input", (event) => this.#onInput(event.target as HTMLInputElement));
    this.value = kNothingDenied;
  }

  get value(): Denied {
    const denied = (kind: Row["kind"], right: CameraRight, known: readonly { id: number }[], before: readonly number[]) => {
      const unknown = before.filter((id) => !known.some((one) => one.id === id));
      const unticked = this.#rows.filter((row) => row.kind === kind && !row.boxes[right].checked);
      return [...unknown, ...unticked.map(({ id }) => id)];
    };
    const rights = (kind: Row["kind"], known: readonly { id: number }[], before: Record<CameraRight, number[]>) =>
      byRight((right) => denied(kind, right, known, before[right]));
    const others = (name: OtherKind) => {
      const ticked = this.#others[name].value;
      const ids = this.#list[name].map(({ id }) => id);
      return [...this.#shown[name].filter((id) => !ids.includes(id)), ...ids.filter((id) => !ticked.includes(id))];
    };
    return ordered({
      ...rights("camera", this.#list.camera, this.#shown),
      group: rights("group", this.#list.group, this.#shown.group),
      emap: others("emap"),
      door: others("door"),
      ioModule: others("ioModule"),
    });
  }

  set value(deny: Denied) {
    this.#shown = deny;
    for (const { kind, id, boxes } of this.#rows) {
      const denied = kind === "group" ? deny.group : deny;
      for (const right of kCameraRights) boxes[right].checked = !denied[right].includes(id);
    }
    for (const [name, field] of Object.entries(this.#others) as [OtherKind, Field<number[]>][]) {
      field.value = this.#list[name].map(({ id }) => id).filter((id) => !deny[name].includes(id));
    }
    this.#adapt();
  }

  #boxes(label: (right: CameraRight) => string): Record<CameraRight, HTMLInputElement> {
    return byRight((right) => element("input", { type: "checkbox", "aria-label": label(right), "data-right": right }));
  }

  #cells(boxes: Row["boxes"]): HTMLElement[] {
    return kCameraRights.map((right) => element("td", {}, element("label", { class: "rights-box" }, boxes[right])));
  }

  #row(kind: Row["kind"], id: number, name: string): Row {
    const text = kind === "group" ? `Group ${name}` : name;
    const boxes = this.#boxes((right) => `${text}: ${kRightNames[right]}`);
    const root = element("tr", { class: `rights-${kind}` }, element("th", { scope: "row" }, text), ...this.#cells(boxes));
    return { kind, id, root, boxes };
  }

  #onInput(box: HTMLInputElement): void {
    const right = box.dataset.right as CameraRight;
    if (box === this.#all[right]) {
      for (const row of this.#rows) if (row.kind === "camera") row.boxes[right].checked = box.checked;
    }
    this.#adapt();
  }

  /** Shows what the ticks of groups and of all come to. */
  #adapt(): void {
    const denied = (right: CameraRight) =>
      this.#rows.filter(({ kind, boxes }) => kind === "group" && !boxes[right].checked).map(({ id }) => id);
    for (const right of kCameraRights) {
      const cameras = this.#rows.filter(({ kind }) => kind === "camera");
      const ticked = cameras.filter(({ boxes }) => boxes[right].checked).length;
      this.#all[right].checked = ticked === cameras.length;
      this.#all[right].indeterminate = ticked > 0 && ticked < cameras.length;
      for (const { kind, id, boxes } of this.#rows) {
        const groups = kind === "group" ? [] : this.#list.group.filter(({ camera }) => camera.includes(id));
        const denying = groups.find((group) => denied(right).includes(group.id));
        boxes[right].classList.toggle("is-covered", denying !== undefined);
        boxes[right].title = denying ? `Denied with the group ${denying.name}` : "";
      }
    }
    for (const { boxes } of this.#rows) {
      const isPlayed = boxes.playback.checked && !boxes.playback.classList.contains("is-covered");
      if (isPlayed || boxes.export.title) continue;
      boxes.export.classList.add("is-covered");
      boxes.export.title = "Denied with playback";
    }
  }
}
