// SPDX-License-Identifier: Apache-2.0
//
// The settings of a camera as fields. Those of a new one begin with its connection; the rest is shown once a test has
// succeeded, or was skipped.

import type {
  CameraRecord,
  CameraSettings,
  CameraSetup,
  CameraSetupList,
  Named,
  ProbeResult,
} from "../../../wire/camera_setup";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import {
  checkField,
  chipsField,
  formPart,
  numberField,
  selectField,
  textField,
  type ChipsField,
} from "../../widgets/fields";
import type { RecordFields } from "../record_page";
import { addressProblem } from "./address";
import { ConnectionFields } from "./connection_fields";
import { kProfiles, PlanField } from "./plan_field";

const kDaysKept = "Older recordings of this camera are deleted. Leave empty to keep them as long as their mount allows.";

export class CameraFields implements RecordFields<CameraSettings> {
  readonly content: HTMLElement[];
  readonly #camera: CameraRecord | null;
  readonly #connection: ConnectionFields;
  readonly #name = textField("Name", { maxlength: "80" });
  readonly #enabled = checkField("Enabled", "When disabled, it is neither shown nor recorded; its footage stays.");
  readonly #audio = checkField("Record and play its sound");
  readonly #ptz = checkField("It can pan, tilt and zoom");
  readonly #live = selectField(
    "Stream of the live view",
    kProfiles.map((text, profile) => [String(profile), text] as const),
  );
  readonly #groups: ChipsField;
  readonly #plan: PlanField;
  readonly #days = numberField("Days kept", 0.01, 36_500, kDaysKept);
  readonly #rest = element("div", { class: "form-group" });
  readonly #skip = button("Skip the test", () => this.#showRest(), "plain");
  #codec = "";

  /** `isWhole`: all fields are shown from the beginning. `addGroup` makes a group, or null where the user would not. */
  constructor(
    setup: CameraSetup,
    camera: CameraRecord | null,
    list: CameraSetupList,
    isWhole: boolean,
    addGroup: () => Promise<Named | null>,
  ) {
    this.#camera = camera;
    this.#groups = chipsField("Groups", list.group);
    this.#plan = new PlanField(list.mount);
    this.#connection = new ConnectionFields(setup, camera, list, (result) => this.#take(result));
    this.#groups.root.append(button("New group…", () => void this.#addGroup(addGroup), "plain"));
    this.#enabled.root.hidden = camera === null;
    const about = [this.#name, this.#enabled, this.#groups, this.#live, this.#audio, this.#ptz];
    this.#rest.append(formPart("Camera", ...about.map(({ root }) => root)), formPart("Recording", this.#plan.root, this.#days.root));
    this.#rest.hidden = !isWhole;
    this.#skip.hidden = isWhole;
    this.content = [formPart("Connection", this.#connection.root, this.#skip), this.#rest];
  }

  get value(): CameraSettings {
    return {
      name: this.#name.value.trim(),
      enabled: this.#enabled.value,
      ...this.#connection.value,
      audio: this.#audio.value,
      ptz: this.#ptz.value,
      liveProfile: Number(this.#live.value),
      group: this.#groups.value,
      plan: this.#plan.value,
      limitDays: this.#days.value,
    };
  }

  set value(settings: CameraSettings) {
    this.#name.value = settings.name;
    this.#enabled.value = settings.enabled;
    this.#connection.value = settings;
    this.#audio.value = settings.audio;
    this.#ptz.value = settings.ptz;
    this.#live.value = String(settings.liveProfile);
    this.#groups.value = settings.group;
    this.#plan.value = settings.plan;
    this.#days.value = settings.limitDays;
  }

  /** As the probe reported it; empty before. */
  get codec(): string {
    return this.#codec;
  }

  /** Undefined: the stored one stays. */
  get password(): string | undefined {
    return this.#connection.password;
  }

  get hasSecrets(): boolean {
    return this.#connection.hasSecrets;
  }

  /** Addresses that are stored need not be ones that can be entered here. */
  problem({ name, source }: CameraSettings): string {
    if (source[0]?.profile !== 0) return "Please enter the camera's address.";
    const stored = this.#camera?.source ?? [];
    const entered = source.filter(({ address }) => !stored.some((one) => one.address === address));
    const wrong = entered.map(({ address }) => addressProblem(address)).find((problem) => problem);
    if (wrong) return wrong;
    if (name) return "";
    this.#showRest();
    return "Please give the camera a name.";
  }

  focus(): void {
    this.#connection.focus();
  }

  clearSecrets(): void {
    this.#connection.clearSecrets();
  }

  close(): void {
    this.#connection.close();
  }

  async #addGroup(ask: () => Promise<Named | null>): Promise<void> {
    const group = await ask();
    if (group) this.#groups.add(group);
  }

  #take({ codec, audio }: ProbeResult): void {
    this.#codec = codec;
    if (this.#camera || !this.#rest.hidden) return;
    this.#audio.value = audio;
    this.#showRest();
  }

  #showRest(): void {
    this.#rest.hidden = false;
    this.#skip.hidden = true;
    this.#name.input.focus();
  }
}
