// SPDX-License-Identifier: Apache-2.0
//
// When a camera records, in which files and where.

import type { CameraSetupList, RecordingPlan } from "../../../wire/camera_setup";
import { element } from "../../widgets/dom";
import { formRow, numberField, radioField, selectField, type Field } from "../../widgets/fields";
import { PlanGrid } from "./plan_grid";
import { kFirstPlan } from "./plan";

const kMinute = 60;
export const kProfiles = ["High", "Low", "Mobile"] as const;

export class PlanField implements Field<RecordingPlan> {
  readonly root = element("div", { class: "form-group" });
  readonly #mode = radioField<RecordingPlan["mode"]>("Record", [
    ["always", "Always"],
    ["schedule", "By the hour"],
    ["never", "On alert only"],
  ]);
  readonly #grid = new PlanGrid();
  readonly #pre = numberField("Seconds before an alert", 0, 300);
  readonly #post = numberField("Seconds after an alert", 0, 300);
  readonly #segment = numberField("Minutes per file", 0.16, 60);
  readonly #profile = selectField(
    "Recorded stream",
    kProfiles.map((name, profile) => [String(profile), name] as const),
  );
  readonly #mount: Field<string>;
  readonly #around: HTMLElement;

  constructor(mounts: CameraSetupList["mount"]) {
    const names = mounts.map(({ id, name }) => [String(id), name] as const);
    this.#mount = selectField("Mount", [["0", "The default mount"], ...names]);
    this.#around = formRow(this.#pre, this.#post);
    const files = formRow(this.#segment, this.#profile, this.#mount);
    this.root.append(this.#mode.root, this.#grid.root, this.#around, files);
    this.root.addEventListener("input", () => this.#adapt());
    this.value = kFirstPlan;
  }

  get value(): RecordingPlan {
    return {
      mode: this.#mode.value,
      segment: Math.round((this.#segment.value ?? 0) * kMinute),
      pre: this.#pre.value ?? 0,
      post: this.#post.value ?? 0,
      mount: Number(this.#mount.value),
      profile: Number(this.#profile.value),
      hours: this.#grid.value,
    };
  }

  set value(plan: RecordingPlan) {
    this.#mode.value = plan.mode;
    this.#segment.value = plan.segment / kMinute;
    this.#pre.value = plan.pre;
    this.#post.value = plan.post;
    this.#mount.value = String(plan.mount);
    this.#profile.value = String(plan.profile);
    this.#grid.value = plan.hours;
    this.#adapt();
  }

  /** Hides what the choice leaves without effect. */
  #adapt(): void {
    const mode = this.#mode.value;
    this.#grid.root.hidden = mode !== "schedule";
    this.#around.hidden = mode === "always" || (mode === "schedule" && !this.#grid.value.includes("2"));
  }
}
