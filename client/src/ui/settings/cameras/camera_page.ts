// SPDX-License-Identifier: Apache-2.0
//
// One camera: add it, having seen its picture, or change, switch off and remove it.

import {
  CameraSetup,
  type CameraRecord,
  type CameraSettings,
  type CameraSetupList,
  type CameraSource,
} from "../../../wire/camera_setup";
import { settingsAddress } from "../../screens/route";
import { element } from "../../widgets/dom";
import { checkField, chipsField, formPart, selectField, textField } from "../../widgets/fields";
import { notify } from "../../widgets/notice";
import { changedFrom } from "../merge";
import { button, emptyState, LoadedPage, type PageContext } from "../page";
import { RecordForm, type Draft } from "../record_form";
import { addressProblem } from "./address";
import { stateText } from "./camera_row";
import { ConnectionFields } from "./connection_fields";
import { kFirstPlan, planText } from "./plan";
import { kProfiles, PlanField } from "./plan_field";
import { askToRemove } from "./remove_camera";

const kFirstSettings: CameraSettings = {
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
};

function settingsOf(camera: CameraRecord): CameraSettings {
  const { name, enabled, account, insecure, audio, ptz, liveProfile, group } = camera;
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
  };
}

export class CameraPage extends LoadedPage<CameraSetupList> {
  readonly #setup: CameraSetup;
  #form: RecordForm<CameraSettings, CameraRecord> | null = null;
  #connection: ConnectionFields | null = null;
  /** As the probe reported it. */
  #codec = "";

  constructor(context: PageContext, id: number | "new") {
    super(context, id === "new" ? "Add a camera" : "Camera");
    this.linkBack("All cameras", settingsAddress("cameras"));
    this.#setup = new CameraSetup(context.server);
    void this.start(
      () => this.#setup.list({ footage: false }),
      (list) => {
        const camera = list.camera.find((one) => one.id === id) ?? null;
        if (id === "new" || camera) this.#showForm(camera, list);
        else this.show(emptyState("camera", "There is no such camera any more.", button("All cameras", context.done)));
      },
    );
  }

  override get isChanged(): boolean {
    return this.#form?.isChanged ?? false;
  }

  override get draft(): Draft | null {
    return this.#form ? this.#form.draft : super.draft;
  }

  override close(): void {
    super.close();
    this.#connection?.close();
  }

  #showForm(camera: CameraRecord | null, list: CameraSetupList): void {
    const name = textField("Name", { maxlength: "80" });
    const enabled = checkField("Enabled", "When off, it is neither shown nor recorded; its footage stays.");
    const [audio, ptz] = [checkField("Record and play its sound"), checkField("It can pan, tilt and zoom")];
    const profiles = kProfiles.map((text, profile) => [String(profile), text] as const);
    const live = selectField("Stream of the live view", profiles);
    const groups = chipsField("Groups", list.group);
    const plan = new PlanField(list.mount);
    const rest = element("div", { class: "form-group" });
    const skip = button("Skip the test", () => showRest(), "plain");
    const showRest = () => {
      rest.hidden = false;
      skip.hidden = true;
      name.input.focus();
    };
    const connection = new ConnectionFields(this.#setup, camera, list, (result) => {
      this.#codec = result.codec;
      if (camera || !rest.hidden) return;
      audio.value = result.audio;
      showRest();
    });
    this.#connection = connection;
    groups.root.hidden = list.group.length === 0;
    enabled.root.hidden = camera === null;
    rest.append(
      formPart("Camera", name.root, enabled.root, groups.root, live.root, audio.root, ptz.root),
      formPart("Recording", plan.root),
    );
    rest.hidden = camera === null && this.context.draft === null;
    skip.hidden = !rest.hidden;
    const names = (ids: readonly number[]) => {
      const groups = list.group.filter(({ id }) => ids.includes(id));
      return groups.map((group) => group.name).join(", ");
    };
    const yesNo = (value: boolean) => (value ? "yes" : "no");
    this.#form = new RecordForm<CameraSettings, CameraRecord>(
      {
        content: [formPart("Connection", connection.root, skip), rest],
        stored: camera,
        initial: kFirstSettings,
        settingsOf,
        read: () => ({
          name: name.value.trim(),
          enabled: enabled.value,
          ...connection.value,
          audio: audio.value,
          ptz: ptz.value,
          liveProfile: Number(live.value),
          group: groups.value,
          plan: plan.value,
        }),
        show: (settings) => {
          name.value = settings.name;
          enabled.value = settings.enabled;
          connection.value = settings;
          audio.value = settings.audio;
          ptz.value = settings.ptz;
          live.value = String(settings.liveProfile);
          groups.value = settings.group;
          plan.value = settings.plan;
        },
        hasSecrets: () => connection.hasSecrets,
        problem: (settings) => this.#problem(settings, camera?.source ?? [], showRest),
        save: (settings, base) => this.#save(settings, base, connection.password),
        describe: {
          name: ["Name", String],
          enabled: ["Enabled", yesNo],
          source: ["Addresses", (source) => source.map(({ address }) => address).join(", ")],
          account: ["Account", String],
          insecure: ["Accepts any certificate", yesNo],
          audio: ["Sound", yesNo],
          ptz: ["Pans, tilts and zooms", yesNo],
          liveProfile: ["Stream of the live view", (profile) => kProfiles[profile] ?? ""],
          group: ["Groups", names],
          plan: ["Recording", (value) => planText(value, list.mount)],
        },
        onSaved: (stored) => {
          connection.clearSecrets();
          notify(camera ? "The camera is saved." : `${stored.name} is added.`);
          this.title = stored.name;
          if (!camera) this.context.done();
        },
        noun: "camera",
        submit: camera ? "Save" : "Add the camera",
        leave: this.context.leave,
      },
      this.context.draft,
    );
    if (!camera) {
      this.show(this.#form.root);
      return connection.focus();
    }
    this.title = camera.name;
    const state = element("p", { class: "quiet" }, stateText(camera));
    const remove = button("Remove this camera…", (pressed) => void this.#remove(camera.id, pressed), "plain");
    this.show(state, this.#form.root, formPart("Remove", remove));
  }

  /** Addresses that are `stored` need not be ones that can be entered here. */
  #problem(settings: CameraSettings, stored: readonly CameraSource[], showRest: () => void): string {
    if (settings.source[0]?.profile !== 0) return "Please enter the camera's address.";
    const entered = settings.source.filter(({ address }) => !stored.some((one) => one.address === address));
    const wrong = entered.map(({ address }) => addressProblem(address)).find((problem) => problem);
    if (wrong) return wrong;
    if (settings.name) return "";
    showRest();
    return "Please give the camera a name.";
  }

  #save(settings: CameraSettings, base: CameraRecord | null, password: string | undefined): Promise<CameraRecord> {
    const secret = password === undefined ? {} : { password };
    if (base) return this.#setup.set(base.id, base.revision, { ...changedFrom(settingsOf(base), settings), ...secret });
    const { enabled: _, ...added } = settings;
    return this.#setup.add(added, password ?? "", this.#codec);
  }

  async #remove(id: number, pressed: HTMLButtonElement): Promise<void> {
    if (await askToRemove(this.root, this.#setup, id, pressed)) this.context.done();
  }
}
