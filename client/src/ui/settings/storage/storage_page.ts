// SPDX-License-Identifier: Apache-2.0
//
// All mounts, and how much room they have.

import { Mounts, type MountRecord } from "../../../wire/mounts";
import { settingsAddress } from "../../route";
import { linkButton } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { emptyState, LoadedPage, type PageContext } from "../page";
import { mountCard } from "./mount_card";

export class StoragePage extends LoadedPage<MountRecord[]> {
  constructor(context: PageContext) {
    const add = settingsAddress("storage", "new");
    super(context, "Storage", linkButton("Add a mount", add, true));
    void this.start(
      () => new Mounts(context.server).list(),
      (mounts) => {
        const sentence = "There is no mount yet, so nothing is recorded. A mount is a folder on a disk of the server.";
        if (mounts.length > 0) this.show(element("ul", { class: "settings-list" }, ...mounts.map(mountCard)));
        else this.show(emptyState("storage", sentence, linkButton("Add the first mount", add, true)));
      },
    );
  }
}
