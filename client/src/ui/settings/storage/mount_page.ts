// SPDX-License-Identifier: Apache-2.0
//
// One mount: where it is, and what limits it. Nothing is deleted before the user has seen how much that is.

import { Mounts, type MountLoss, type MountRecord, type MountSettings } from "../../../wire/mounts";
import { bytesText, counted, kGigabyte } from "../../widgets/amounts";
import { settingsAddress } from "../../screens/route";
import { element, setText } from "../../widgets/dom";
import { checkField, formPart, formRow, numberField, textField } from "../../widgets/fields";
import { openDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { minuteText } from "../../widgets/text";
import { changedFrom } from "../merge";
import { button, emptyState, LoadedPage, type PageContext } from "../page";
import { RecordForm, type Draft } from "../record_form";
import { limitsEffect } from "./storage_text";

type Settings = MountSettings & { path: string };

const kFirstSettings: Settings = { name: "", path: "", enabled: true, default: false, limitBytes: null, limitDays: null };

function settingsOf({ name, path, enabled, default: isDefault, limit }: MountRecord): Settings {
  return { name, path, enabled, default: isDefault, limitBytes: limit.bytes, limitDays: limit.days };
}

export class MountPage extends LoadedPage<MountRecord[]> {
  readonly #mounts: Mounts;
  #form: RecordForm<Settings, MountRecord> | null = null;
  #mount: MountRecord | null = null;

  constructor(context: PageContext, id: number | "new") {
    super(context, id === "new" ? "Add a mount" : "Mount");
    this.linkBack("All mounts", settingsAddress("storage"));
    this.#mounts = new Mounts(context.server);
    void this.start(
      () => this.#mounts.list(),
      (mounts) => {
        this.#mount = mounts.find((one) => one.id === id) ?? null;
        if (id === "new" || this.#mount) this.#showForm();
        else this.show(emptyState("storage", "There is no such mount any more.", button("All mounts", context.done)));
      },
    );
  }

  override get isChanged(): boolean {
    return this.#form?.isChanged ?? false;
  }

  override get draft(): Draft | null {
    return this.#form ? this.#form.draft : super.draft;
  }

  #showForm(): void {
    const mount = this.#mount;
    const name = textField("Name", { maxlength: "80" });
    const where =
      "An empty folder on the server, below one that its operator allows (initially /mnt, /media and /srv).";
    const path = textField("Folder", { readonly: mount !== null, placeholder: "/srv/recordings" }, mount ? "" : where);
    const enabled = checkField("Record to this mount", "When off, its recordings can still be played.");
    const isDefault = checkField("The default mount", "For cameras that name no other.");
    const [days, gigabytes] = [numberField("Days", 1, 36_500), numberField("Size in GB", 0.1, 10_000_000)];
    const effect = element("p", { class: "form-hint", "aria-live": "polite" });
    enabled.root.hidden = mount === null;
    // Another one is made the default instead.
    isDefault.root.hidden = mount?.default ?? false;
    const hint = "Footage beyond either limit is deleted, the oldest first. Leave empty for no limit but the disk.";
    const limits = formPart("Limits", element("p", { class: "form-hint" }, hint), formRow(days, gigabytes), effect);
    const read = (): Settings => ({
      name: name.value.trim(),
      path: path.value.trim(),
      enabled: enabled.value,
      default: isDefault.value,
      limitBytes: gigabytes.value === null ? null : Math.round(gigabytes.value * kGigabyte),
      limitDays: days.value,
    });
    const showEffect = () => setText(effect, this.#mount ? limitsEffect(read(), this.#mount) : "");
    const yesNo = (value: boolean) => (value ? "yes" : "no");
    this.#form = new RecordForm<Settings, MountRecord>(
      {
        content: [formPart("Mount", name.root, path.root, enabled.root, isDefault.root), limits],
        stored: mount,
        initial: kFirstSettings,
        settingsOf,
        read,
        show: (settings) => {
          name.value = settings.name;
          path.value = settings.path;
          enabled.value = settings.enabled;
          isDefault.value = settings.default;
          days.value = settings.limitDays;
          gigabytes.value = settings.limitBytes === null ? null : settings.limitBytes / kGigabyte;
          showEffect();
        },
        hasSecrets: () => false,
        problem: ({ name: named, path: folder }) => {
          if (!named) return "Please give the mount a name.";
          return folder.startsWith("/") ? "" : "The folder begins with a slash.";
        },
        save: (settings, base) => this.#save(settings, base),
        describe: {
          name: ["Name", String],
          path: ["Folder", String],
          enabled: ["Record to this mount", yesNo],
          default: ["Default", yesNo],
          limitBytes: ["At most", (value) => (value === null ? "no limit" : bytesText(value))],
          limitDays: ["Days", (value) => (value === null ? "no limit" : String(value))],
        },
        onSaved: (stored) => {
          this.#mount = stored;
          notify(mount ? "The mount is saved." : `${stored.name} is added.`);
          if (!mount) this.context.done();
        },
        noun: "mount",
        submit: mount ? "Save" : "Add the mount",
        leave: this.context.leave,
      },
      this.context.draft,
    );
    this.#form.root.addEventListener("input", showEffect);
    this.show(this.#form.root);
    if (!mount) return name.input.focus();
    this.title = mount.name;
    this.show(this.#form.root, formPart("Remove", button("Remove this mount…", () => void this.#remove(), "plain")));
  }

  async #save(settings: Settings, base: MountRecord | null): Promise<MountRecord | null> {
    const { path, enabled, ...rest } = settings;
    if (!base) return this.#mounts.add({ ...rest, path });
    const { path: _, ...changes } = changedFrom(settingsOf(base), settings);
    const answer = await this.#mounts.set(base.id, base.revision, changes, false);
    if ("mount" in answer) return answer.mount;
    return this.#askForLoss(answer.confirm, () => this.#mounts.set(base.id, base.revision, changes, true));
  }

  /** Null where the user would rather keep it. */
  async #askForLoss(
    { events, bytes, until }: MountLoss,
    save: () => ReturnType<Mounts["set"]>,
  ): Promise<MountRecord | null> {
    const what = `${counted(events, "event")} with ${bytesText(bytes)} of footage`;
    const sentence = `These limits would delete ${what}: everything before ${minuteText(until * 1000)}.`;
    let saved: MountRecord | null = null;
    await openDialog(this.root, {
      title: "Delete footage?",
      content: [element("p", {}, sentence)],
      submit: "Save and delete",
      attempt: async () => {
        const answer = await save();
        if ("mount" in answer) saved = answer.mount;
      },
    });
    return saved;
  }

  async #remove(): Promise<void> {
    const mount = this.#mount!;
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
