// SPDX-License-Identifier: Apache-2.0
//
// All doors, I/O modules and POS terminals: add, change and remove them. They are placed on maps by the map editor.

import { CameraSetup, type Named } from "../../../wire/camera_setup";
import { Devices, type DeviceRecord } from "../../../wire/devices";
import { asServerError } from "../../../wire/server";
import { settingsAddress } from "../../route";
import { counted } from "../../widgets/amounts";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { notify } from "../../widgets/notice";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { askToAdd, askToChange, askToRemove, kKinds } from "./device_dialogs";

const kNone = "There are no devices yet. Doors, I/O modules and POS terminals are placed on maps and show their state.";

/** Devices, and the cameras that can watch them. */
interface DeviceList {
  devices: readonly DeviceRecord[];
  cameras: readonly Named[];
}

export class DevicesPage extends LoadedPage<DeviceList> {
  readonly #devices: Devices;
  readonly #setup: CameraSetup;
  readonly #list = element("ul", { class: "settings-list" });
  #cameras: readonly Named[] = [];

  constructor(context: PageContext) {
    super(context, "Devices", button("Add a device…", () => this.#add(), "primary"));
    this.linkBack("All maps", settingsAddress("maps"));
    this.#devices = new Devices(context.server);
    this.#setup = new CameraSetup(context.server);
    void this.start(
      async () => {
        const [devices, { camera }] = await Promise.all([this.#devices.list(), this.#setup.list({ footage: false })]);
        return { devices, cameras: camera };
      },
      ({ devices, cameras }) => {
        this.#cameras = cameras;
        this.#showDevices(devices);
      },
    );
  }

  #add(): void {
    void this.#after(askToAdd(this.root, this.#devices, this.#cameras), "The device is added. Place it on a map next.");
  }

  /** Shows what there is once the dialog is closed, which may be more than the user has done. */
  async #after(dialog: Promise<boolean>, sentence: string): Promise<void> {
    if (await dialog) notify(sentence);
    try {
      const devices = await this.#devices.list();
      if (!this.closed.aborted) this.#showDevices(devices);
    } catch (error) {
      notify(asServerError(error).message);
    }
  }

  #showDevices(devices: readonly DeviceRecord[]): void {
    if (devices.length === 0) {
      return this.show(emptyState("map", kNone, button("Add the first device…", () => this.#add(), "primary")));
    }
    this.#list.replaceChildren(...devices.map((device) => this.#row(device)));
    if (!this.#list.isConnected) this.show(this.#list);
  }

  #row(device: DeviceRecord): HTMLElement {
    const { name } = device;
    const change = button("Change…", () => {
      void this.#after(askToChange(this.root, this.#devices, device, this.#cameras), `${name} is changed.`);
    });
    const remove = button("Remove…", () => {
      void this.#after(askToRemove(this.root, this.#devices, device), `${name} is removed.`);
    });
    change.setAttribute("aria-label", `Change ${name}`);
    remove.setAttribute("aria-label", `Remove ${name}`);
    return element(
      "li",
      { class: "card device-row" },
      element("div", { class: "device-name" }, element("h3", {}, name), element("p", { class: "quiet" }, this.#facts(device))),
      change,
      remove,
    );
  }

  #facts({ kind, camera, port, server }: DeviceRecord): string {
    const watching = this.#cameras.find(({ id }) => id === camera)?.name ?? (camera === 0 ? "" : `camera ${camera}`);
    const facts = [kKinds[kind], kind === "io" ? counted(port.length, "port") : watching, server === 0 ? "" : "of a paired host"];
    return facts.filter(Boolean).join(" · ");
  }
}
