// SPDX-License-Identifier: Apache-2.0
//
// One mount: where it is, and what limits it.

import { Mounts, type MountRecord } from "../../../wire/mounts";
import { bytesText } from "../../widgets/amounts";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { formPart } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { yesNo } from "../../widgets/text";
import type { Descriptions } from "../conflict_panel";
import { changedFrom } from "../merge";
import type { PageContext } from "../page";
import { RecordPage, type RecordKind } from "../record_page";
import { saveWithConsent } from "../save_with_consent";
import { MountFields, type MountFormSettings as Settings } from "./mount_fields";

function settingsOf({ name, path, enabled, default: isDefault, limit }: MountRecord): Settings {
  return { name, path, enabled, default: isDefault, limitBytes: limit.bytes, limitDays: limit.days };
}

const kKind: RecordKind<Settings, MountRecord> = {
  noun: "mount",
  aNoun: "a mount",
  section: "storage",
  icon: "storage",
  initial: { name: "", path: "", enabled: true, default: false, limitBytes: null, limitDays: null },
  settingsOf,
};

export class MountPage extends RecordPage<MountRecord[], Settings, MountRecord, MountFields> {
  readonly #mounts: Mounts;

  constructor(context: PageContext, id: number | "new") {
    super(context, id, kKind);
    this.#mounts = new Mounts(context.server);
    this.load(
      () => this.#mounts.list(),
      (mounts) => mounts,
    );
  }

  protected newFields(): MountFields {
    return new MountFields(() => this.record);
  }

  protected descriptions(): Descriptions<Settings> {
    return {
      name: ["Name", String],
      path: ["Folder", String],
      enabled: ["Record to this mount", yesNo],
      default: ["Default", yesNo],
      limitBytes: ["At most", (value) => (value === null ? "no limit" : bytesText(value))],
      limitDays: ["Days", (value) => (value === null ? "no limit" : String(value))],
    };
  }

  protected below(): Node[] {
    return [formPart("Remove", button("Remove this mount…", () => void this.#remove(), "plain"))];
  }

  protected async save(settings: Settings, base: MountRecord | null): Promise<MountRecord | null> {
    const { path, enabled, ...rest } = settings;
    if (!base) return this.#mounts.add({ ...rest, path });
    const { path: _, ...changes } = changedFrom(settingsOf(base), settings);
    const set = (confirm: boolean) => this.#mounts.set(base.id, base.revision, changes, confirm);
    return (await saveWithConsent(this.root, set))?.mount ?? null;
  }

  async #remove(): Promise<void> {
    const mount = this.record!;
    const isDone = await openDialog(this.root, {
      title: `Remove ${mount.name}?`,
      content: [element("p", {}, "The server stops using the folder; its files stay.")],
      submit: "Remove",
      attempt: async () => void (await this.#mounts.remove(mount)),
    });
    if (!isDone) return;
    notify(`${mount.name} is removed.`);
    this.context.done();
  }
}
