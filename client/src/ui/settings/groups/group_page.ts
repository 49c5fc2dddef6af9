// SPDX-License-Identifier: Apache-2.0
//
// One camera group: its name and its cameras.

import { Groups, type GroupRecord, type GroupSettings } from "../../../wire/groups";
import type { Named } from "../../../wire/camera_setup";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { chipsField, formPart, textField, type ChipsField } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import type { Descriptions } from "../conflict_panel";
import { changedFrom } from "../merge";
import type { PageContext } from "../page";
import { RecordPage, type RecordFields, type RecordKind } from "../record_page";
import { listGroups, type GroupList } from "./groups_page";

function settingsOf({ name, camera }: GroupSettings): GroupSettings {
  return { name, camera: [...camera].sort((one, other) => one - other) };
}

const kKind: RecordKind<GroupSettings, GroupRecord> = {
  noun: "group",
  aNoun: "a group",
  section: "groups",
  icon: "camera",
  initial: { name: "", camera: [] },
  settingsOf,
};

export class GroupFields implements RecordFields<GroupSettings> {
  readonly content: HTMLElement[];
  readonly hasSecrets = false;
  readonly #name = textField("Name", { maxlength: "64" });
  readonly #cameras: ChipsField;
  readonly #known: ReadonlySet<number>;
  /** Members that were removed as cameras; they cannot be shown. */
  #removed: number[] = [];

  constructor(cameras: readonly Named[]) {
    this.#cameras = chipsField("Cameras", cameras);
    this.#known = new Set(cameras.map(({ id }) => id));
    const none = element("p", { class: "form-hint", hidden: cameras.length > 0 }, "There are no cameras yet.");
    this.content = [formPart("Group", this.#name.root, this.#cameras.root, none)];
  }

  get value(): GroupSettings {
    return settingsOf({ name: this.#name.value.trim(), camera: [...this.#cameras.value, ...this.#removed] });
  }

  set value({ name, camera }: GroupSettings) {
    this.#name.value = name;
    this.#cameras.value = camera;
    this.#removed = camera.filter((id) => !this.#known.has(id));
  }

  problem({ name }: GroupSettings): string {
    return name ? "" : "Please give the group a name.";
  }

  focus(): void {
    this.#name.input.focus();
  }

  clearSecrets(): void {}
}

export class GroupPage extends RecordPage<GroupList, GroupSettings, GroupRecord, GroupFields> {
  readonly #groups: Groups;

  constructor(context: PageContext, id: number | "new") {
    super(context, id, kKind);
    this.#groups = new Groups(context.server);
    this.load(
      () => listGroups(context),
      ({ group }) => group,
    );
  }

  protected newFields(_group: GroupRecord | null, { camera }: GroupList): GroupFields {
    return new GroupFields(camera);
  }

  protected descriptions({ camera }: GroupList): Descriptions<GroupSettings> {
    const namesOf = (ids: readonly number[]) => camera.filter(({ id }) => ids.includes(id)).map(({ name }) => name);
    return { name: ["Name", String], camera: ["Cameras", (ids) => namesOf(ids).join(", ")] };
  }

  protected below(): Node[] {
    return [formPart("Remove", button("Remove this group…", () => void this.#remove(), "plain"))];
  }

  protected save(settings: GroupSettings, base: GroupRecord | null): Promise<GroupRecord> {
    if (!base) return this.#groups.add(settings);
    return this.#groups.set(base.id, base.revision, changedFrom(settingsOf(base), settings));
  }

  async #remove(): Promise<void> {
    const group = this.record!;
    const accounts = group.deniedTo.join(", ");
    const denied = `It is denied to ${accounts}, who may see its cameras then unless they are denied by themselves.`;
    const sentences = ["Its cameras stay as they are.", ...(group.deniedTo.length > 0 ? [denied] : [])];
    const isDone = await openDialog(this.root, {
      title: `Remove ${group.name}?`,
      content: sentences.map((sentence) => element("p", {}, sentence)),
      submit: "Remove",
      attempt: async () => void (await this.#groups.remove(group)),
    });
    if (!isDone) return;
    notify(`${group.name} is removed.`);
    this.context.done();
  }
}
