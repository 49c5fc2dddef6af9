// SPDX-License-Identifier: Apache-2.0
//
// How a camera is reached: its addresses, its account, and a test of the connection.

import type {
  CameraRecord,
  CameraSettings,
  CameraSetup,
  CameraSetupList,
  CameraSource,
  ProbeRequest,
  ProbeResult,
} from "../../../wire/camera_setup";
import { element } from "../../widgets/dom";
import { checkField, formRow, secretField, selectField, textField, type TextField } from "../../widgets/fields";
import { withPath } from "./address";
import { kProfiles } from "./plan_field";
import { ProbePanel } from "./probe_panel";

export type Connection = Pick<CameraSettings, "source" | "account" | "insecure">;

export class ConnectionFields {
  readonly root = element("div", { class: "form-group" });
  readonly #camera: CameraRecord | null;
  readonly #probe: ProbePanel;
  readonly #addresses = kProfiles.map((name, profile) =>
    textField(profile === 0 ? "Address" : `${name} stream address`, {
      type: "url",
      inputmode: "url",
      autocapitalize: "none",
      placeholder: "rtsp://192.0.2.10/",
    }),
  );
  readonly #account = textField("The camera's account", { autocapitalize: "none", maxlength: "256" });
  readonly #password: TextField;
  readonly #forget = checkField("Remove the stored password");
  readonly #insecure = checkField(
    "Accept any certificate",
    "For https:// cameras whose certificate is not signed by a trusted authority. " +
      "Anyone on your network could then impersonate the camera.",
  );
  #stored: readonly CameraSource[] = [];

  constructor(
    setup: CameraSetup,
    camera: CameraRecord | null,
    { path }: CameraSetupList,
    onResult: (result: ProbeResult) => void,
  ) {
    this.#camera = camera;
    const hasPassword = camera?.hasPassword ?? false;
    const hint =
      "Leave empty to keep the stored password. It is never shown, and never sent to another host.";
    this.#password = secretField("The camera's password", hasPassword ? hint : "");
    this.#forget.root.hidden = !hasPassword;
    this.#probe = new ProbePanel(setup, () => this.#request(), onResult);
    const [address, ...others] = this.#addresses as [TextField, ...TextField[]];
    const common = path.map((one) => [one.path, `${one.name}: ${one.path}`] as const);
    const why = "If the manual gives no address, one of these often works.";
    const paths = selectField("Common paths", [["", "Choose one to try…"], ...common], why);
    paths.root.addEventListener("input", () => {
      if (paths.value) address.value = withPath(address.value, paths.value);
    });
    const summary = element("summary", {}, "More streams of this camera");
    const more = element("details", { class: "form-more" }, summary, ...others.map(({ root }) => root));
    more.open = camera !== null && camera.source.some(({ profile }) => profile > 0);
    const encrypted = () => (this.#insecure.root.hidden = !this.#addresses.some(({ value }) => /^https:/i.test(value)));
    this.root.addEventListener("input", encrypted);
    paths.root.hidden = path.length === 0;
    const account = formRow(this.#account, this.#password);
    this.root.append(address.root, paths.root, account, this.#forget.root, this.#insecure.root, more, this.#probe.root);
    encrypted();
  }

  get hasSecrets(): boolean {
    return this.#password.value !== "" || this.#forget.value;
  }

  /** Undefined: the stored one stays. */
  get password(): string | undefined {
    if (this.#password.value) return this.#password.value;
    return this.#forget.value ? "" : undefined;
  }

  get value(): Connection {
    const source = this.#addresses.map((field, profile) => {
      const stored = this.#stored.find((one) => one.profile === profile);
      return { ...stored, profile, address: field.value.trim() };
    });
    const account = this.#account.value.trim();
    return { source: source.filter(({ address }) => address), account, insecure: this.#insecure.value };
  }

  set value({ source, account, insecure }: Connection) {
    this.#stored = source;
    this.#addresses.forEach((field, at) => (field.value = source.find(({ profile }) => profile === at)?.address ?? ""));
    this.#account.value = account;
    this.#insecure.value = insecure;
    this.root.dispatchEvent(new Event("input"));
  }

  clearSecrets(): void {
    this.#password.value = "";
    this.#forget.value = false;
  }

  focus(): void {
    this.#addresses[0]!.input.focus();
  }

  close(): void {
    this.#probe.close();
  }

  #request(): ProbeRequest {
    const { account, insecure } = this.value;
    const password = this.password;
    return {
      address: this.#addresses[0]!.value.trim(),
      account,
      insecure,
      ...(password === undefined ? {} : { password }),
      ...(this.#camera ? { camera: this.#camera.id } : {}),
    };
  }
}
