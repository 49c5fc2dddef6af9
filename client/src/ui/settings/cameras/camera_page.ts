// SPDX-License-Identifier: Apache-2.0
//
// One camera: add it, having seen its picture, or change, disable and remove it.

import { CameraSetup, type CameraRecord, type CameraSettings, type CameraSetupList } from "../../../wire/camera_setup";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { formPart } from "../../widgets/fields";
import { yesNo } from "../../widgets/text";
import type { Descriptions } from "../conflict_panel";
import { changedFrom } from "../merge";
import type { PageContext } from "../page";
import { RecordPage, type RecordKind } from "../record_page";
import { saveWithConsent } from "../save_with_consent";
import { askForGroup } from "../groups/ask_for_group";
import { CameraFields } from "./camera_fields";
import { stateText } from "./camera_row";
import { kFirstPlan, planText } from "./plan";
import { kProfiles } from "./plan_field";
import { askToRemove } from "./remove_camera";

function settingsOf(camera: CameraRecord): CameraSettings {
  const { name, enabled, account, insecure, audio, ptz, liveProfile, group, limitDays } = camera;
  const { mode, segment, pre, post, mount, profile, hours } = camera.plan;
  return {
    name,
    enabled,
    source: [...camera.source].sort((one, other) => one.profile - other.profile),
    account,
    insecure,
    audio,
    ptz,
    liveProfile,
    group: [...group].sort((one, other) => one - other),
    plan: { mode, segment, pre, post, mount, profile, hours },
    limitDays,
  };
}

const kKind: RecordKind<CameraSettings, CameraRecord> = {
  noun: "camera",
  aNoun: "a camera",
  section: "cameras",
  icon: "camera",
  initial: {
    name: "",
    enabled: true,
    source: [],
    account: "",
    insecure: false,
    audio: false,
    ptz: false,
    liveProfile: 0,
    group: [],
    plan: kFirstPlan,
    limitDays: null,
  },
  settingsOf,
};

export class CameraPage extends RecordPage<CameraSetupList, CameraSettings, CameraRecord, CameraFields> {
  readonly #setup: CameraSetup;
  #fields: CameraFields | null = null;

  constructor(context: PageContext, id: number | "new") {
    super(context, id, kKind);
    this.#setup = new CameraSetup(context.server);
    this.load(
      () => this.#setup.list({ footage: false }),
      ({ camera }) => camera,
    );
  }

  override close(): void {
    super.close();
    this.#fields?.close();
  }

  protected newFields(camera: CameraRecord | null, list: CameraSetupList): CameraFields {
    const isWhole = camera !== null || this.context.draft !== null;
    this.#fields = new CameraFields(this.#setup, camera, list, isWhole, async () => {
      const group = await askForGroup(this.root, this.context.server);
      if (group) list.group.push(group);
      return group;
    });
    return this.#fields;
  }

  protected descriptions({ group, mount }: CameraSetupList): Descriptions<CameraSettings> {
    const namesOf = (ids: readonly number[]) => group.filter(({ id }) => ids.includes(id)).map(({ name }) => name);
    return {
      name: ["Name", String],
      enabled: ["Enabled", yesNo],
      source: ["Addresses", (source) => source.map(({ address }) => address).join(", ")],
      account: ["Account", String],
      insecure: ["Accepts any certificate", yesNo],
      audio: ["Sound", yesNo],
      ptz: ["Pans, tilts and zooms", yesNo],
      liveProfile: ["Stream of the live view", (profile) => kProfiles[profile] ?? ""],
      group: ["Groups", (ids) => namesOf(ids).join(", ")],
      plan: ["Recording", (plan) => planText(plan, mount)],
      limitDays: ["Days kept", (days) => (days === null ? "as its mount allows" : String(days))],
    };
  }

  protected override above(camera: CameraRecord): Node[] {
    return [element("p", { class: "quiet" }, stateText(camera))];
  }

  protected below({ id }: CameraRecord): Node[] {
    return [formPart("Remove", button("Remove this camera…", (pressed) => void this.#remove(id, pressed), "plain"))];
  }

  protected async save(
    settings: CameraSettings,
    base: CameraRecord | null,
    { password, codec }: CameraFields,
  ): Promise<CameraRecord | null> {
    if (!base) {
      const { enabled: _, ...added } = settings;
      return this.#setup.add(added, password ?? "", codec);
    }
    const secret = password === undefined ? {} : { password };
    const changes = { ...changedFrom(settingsOf(base), settings), ...secret };
    const set = (confirm: boolean) => this.#setup.set(base.id, base.revision, changes, confirm);
    return (await saveWithConsent(this.root, set))?.camera ?? null;
  }

  async #remove(id: number, pressed: HTMLButtonElement): Promise<void> {
    if (await askToRemove(this.root, this.#setup, id, pressed)) this.context.done();
  }
}
