// SPDX-License-Identifier: Apache-2.0
//
// All hosts that this one is paired with: those whose cameras are shown here, and those that show this one's.

import { Hosts, type HostList, type HostRecord } from "../../../wire/hosts";
import { asServerError } from "../../../wire/server";
import { settingsAddress } from "../../route";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { notify } from "../../widgets/notice";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { addHost } from "./add_host";
import { showCode } from "./code_dialog";
import { hostCard } from "./host_card";
import { askToRemoveHost } from "./remove_host";

const kOff = "Cameras of paired hosts are not shown: central management is off. It is a setting of the page ";

function systemLink(): HTMLElement {
  return element("a", { href: settingsAddress("system") }, "System");
}

export class HostsPage extends LoadedPage<HostList> {
  readonly #hosts: Hosts;
  /** Ends the questions of the list that is shown. */
  #asking = new AbortController();

  constructor(context: PageContext) {
    const actions = element("span", { class: "host-actions" });
    super(context, "Hosts", actions);
    this.#hosts = new Hosts(context.server);
    actions.append(
      button("Show a code", () => void showCode(this.root, this.#hosts).then(() => this.#load())),
      button("Add a host", () => void this.#add(), "primary"),
    );
    this.#load();
  }

  override close(): void {
    super.close();
    this.#asking.abort();
  }

  #load(): void {
    if (this.closed.aborted) return;
    void this.start(
      () => this.#hosts.list(),
      (list) => this.#showList(list),
    );
  }

  #showList({ server, centralManagement }: HostList): void {
    this.#asking.abort();
    this.#asking = new AbortController();
    const shown = server.filter(({ address }) => address !== "");
    const showing = server.filter(({ address }) => address === "");
    const sentence =
      "No paired host yet. To show cameras that another host records, have that host show a code, and add it here.";
    if (server.length === 0) return this.show(emptyState("hosts", sentence, button("Add a host", () => void this.#add(), "primary")));
    const hint = shown.length > 0 && !centralManagement ? [element("p", { class: "record-trouble" }, kOff, systemLink(), ".")] : [];
    this.show(
      ...hint,
      ...this.#group("Their cameras are shown here", shown),
      ...this.#group("They show cameras of this host", showing),
    );
  }

  #group(heading: string, records: readonly HostRecord[]): HTMLElement[] {
    if (records.length === 0) return [];
    const cards = records.map((record) => {
      const card = hostCard(record, () => void this.#remove(record));
      if (record.address && record.enabled) {
        this.#hosts.whyAway(record.id, this.#asking.signal).then(card.showState, (error: unknown) => {
          if (!this.#asking.signal.aborted) card.showState(asServerError(error).message.replace(/\.$/, ""));
        });
      }
      return card.root;
    });
    return [element("h3", { class: "host-heading" }, heading), element("ul", { class: "settings-list" }, ...cards)];
  }

  async #add(): Promise<void> {
    await addHost(this.root, this.#hosts, ({ name }) => {
      notify(`${name} is added.`);
      this.#load();
    });
  }

  async #remove(record: HostRecord): Promise<void> {
    await askToRemoveHost(this.root, this.#hosts, record);
    // Also where it was refused: somebody else may have changed it.
    this.#load();
  }
}
