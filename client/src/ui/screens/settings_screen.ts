// SPDX-License-Identifier: Apache-2.0
//
// The settings' screen, for managers: its sections, and in each a list or one record of it.

import { leaveSettingsRecord, openSettings, settingsAddress, type OpenSettings, type SettingsSection } from "../route";
import { AccountPage } from "../settings/accounts/account_page";
import { AccountsPage } from "../settings/accounts/accounts_page";
import { AuditPage } from "../settings/audit/audit_page";
import { CameraPage } from "../settings/cameras/camera_page";
import { CamerasPage } from "../settings/cameras/cameras_page";
import { DevicesPage } from "../settings/devices/devices_page";
import { GroupPage } from "../settings/groups/group_page";
import { GroupsPage } from "../settings/groups/groups_page";
import { HostsPage } from "../settings/hosts/hosts_page";
import { MapsPage } from "../settings/maps/maps_page";
import { noRightState, type Page, type PageContext } from "../settings/page";
import { MountPage } from "../settings/storage/mount_page";
import { StoragePage } from "../settings/storage/storage_page";
import { SystemPage } from "../settings/system/system_page";
import { element } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";
import type { KeyList } from "../widgets/keys_dialog";
import { titleScreen } from "../widgets/title";
import { Screen } from "./screen";
import type { RememberedState, Session } from "./session";
import { SetupSteps } from "./setup_steps";

type MenuSection = Exclude<SettingsSection, "groups" | "devices">;
const kReachedFrom: Partial<Record<SettingsSection, MenuSection>> = { groups: "cameras", devices: "maps" };
const kSections: Record<MenuSection, [label: string, icon: IconName]> = {
  cameras: ["Cameras", "camera"],
  maps: ["Maps", "map"],
  accounts: ["Accounts", "people"],
  storage: ["Storage", "storage"],
  hosts: ["Hosts", "hosts"],
  system: ["System", "system"],
  audit: ["Audit log", "audit"],
};

const kLists: Record<SettingsSection, new (context: PageContext) => Page> = {
  cameras: CamerasPage,
  groups: GroupsPage,
  maps: MapsPage,
  devices: DevicesPage,
  accounts: AccountsPage,
  storage: StoragePage,
  hosts: HostsPage,
  system: SystemPage,
  audit: AuditPage,
};

const kRecords: Partial<Record<SettingsSection, new (context: PageContext, id: number | "new") => Page>> = {
  cameras: CameraPage,
  groups: GroupPage,
  accounts: AccountPage,
  storage: MountPage,
};

export class SettingsScreen extends Screen {
  readonly #session: Session;
  readonly #remembered: RememberedState;
  readonly #links: HTMLAnchorElement[] = [];
  readonly #place = element("div", { class: "settings-page" });
  readonly #steps = new SetupSteps();
  #page: Page | null = null;
  /** The address of the page. */
  #address = "";
  /** The user has agreed to lose the changes. */
  #discards = false;

  constructor(session: Session) {
    super("settings", session);
    this.#session = session;
    this.#remembered = session.remembered;
    this.progress.hidden = true;
    this.addToBar(element("span", { class: "bar-gap" }));
    if (!session.account.is_manager) {
      this.#place.append(noRightState());
      this.front.append(element("div", { class: "settings-body" }, this.#place));
      return;
    }
    for (const [section, [label, name]] of Object.entries(kSections) as [keyof typeof kSections, [string, IconName]][]) {
      const href = settingsAddress(section);
      this.#links.push(element("a", { class: "settings-link", href }, icon(name), element("span", {}, label)));
    }
    const sections = element("nav", { class: "settings-nav", "aria-label": "Settings" }, ...this.#links);
    if (this.#remembered.isSettingUp) this.front.append(this.#steps.root);
    this.front.append(element("div", { class: "settings-body" }, sections, this.#place));
    addEventListener("beforeunload", (event) => this.#page?.isChanged && event.preventDefault(), { signal: this.closed });
    this.#open();
  }

  override close(): void {
    super.close();
    this.#closePage();
    this.#remembered.isSettingUp = false;
  }

  /** Asks first where changes would be lost. */
  override canLeave(): boolean {
    if (!this.#page?.isChanged) return true;
    return (this.#discards = confirm("Leave without saving your changes?"));
  }

  followRoute(): boolean {
    if (addressOf(openSettings()) === this.#address || !this.#session.account.is_manager) return true;
    if (!this.#discards && !this.canLeave()) return false;
    this.#open();
    this.#place.querySelector<HTMLElement>("h2")?.focus({ preventScroll: true });
    return true;
  }

  protected get keys(): KeyList {
    return [
      ["Tab", "From control to control"],
      ["Up Down", "On a handle in the list of cameras: move the camera"],
      ["Left Right Up Down", "In the recording plan: from hour to hour; with Shift paint on the way"],
      ["0 1 2", "In the recording plan: never, always, on alert"],
    ];
  }

  protected pressKey(): boolean {
    return false;
  }

  #open(): void {
    this.#closePage();
    const route = openSettings();
    this.#address = addressOf(route);
    this.#steps.show(route);
    const draft = this.#remembered.settingsDraft?.address === this.#address ? this.#remembered.settingsDraft.draft : null;
    if (draft) this.#remembered.settingsDraft = null;
    const leave = (isAsked: boolean) => {
      this.#discards = !isAsked;
      leaveSettingsRecord();
    };
    const context: PageContext = {
      server: this.server,
      account: this.#session.account,
      draft,
      leave: () => leave(true),
      done: () => leave(false),
    };
    const record = route.open === null ? undefined : kRecords[route.section];
    this.#page = record ? new record(context, route.open!) : new kLists[route.section](context);
    this.#place.replaceChildren(this.#page.root);
    this.#place.scrollTop = 0;
    const section = kReachedFrom[route.section] ?? (route.section as MenuSection);
    titleScreen(kSections[section][0]);
    this.#links.forEach((link) => {
      if (link.getAttribute("href") === settingsAddress(section)) link.setAttribute("aria-current", "page");
      else link.removeAttribute("aria-current");
    });
  }

  #closePage(): void {
    const draft = this.#discards ? null : (this.#page?.draft ?? null);
    // Nobody was asked: the session has ended.
    if (draft) this.#remembered.settingsDraft = { address: this.#address, draft };
    this.#page?.close();
    this.#page = null;
    this.#discards = false;
  }
}

function addressOf({ section, open }: OpenSettings): string {
  return settingsAddress(section, open);
}
