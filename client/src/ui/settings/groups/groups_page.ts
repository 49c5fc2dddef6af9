// SPDX-License-Identifier: Apache-2.0
//
// All camera groups, and which cameras are in each.

import { CameraSetup, type Named } from "../../../wire/camera_setup";
import { Groups, type GroupRecord } from "../../../wire/groups";
import { settingsAddress } from "../../route";
import { linkButton } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { emptyState, LoadedPage, type PageContext } from "../page";

/** Groups, and the cameras that can be in them. */
export interface GroupList {
  group: GroupRecord[];
  camera: Named[];
}

export async function listGroups({ server }: PageContext): Promise<GroupList> {
  const [group, { camera }] = await Promise.all([
    new Groups(server).list(),
    new CameraSetup(server).list({ footage: false }),
  ]);
  return { group, camera };
}

const kNone = "There are no groups yet. Cameras in a group are viewed, searched and denied together.";

export class GroupsPage extends LoadedPage<GroupList> {
  constructor(context: PageContext) {
    const add = settingsAddress("groups", "new");
    super(context, "Camera groups", linkButton("Add a group", add, true));
    this.linkBack("All cameras", settingsAddress("cameras"));
    void this.start(
      () => listGroups(context),
      ({ group, camera }) => {
        const rows = group.map((one) => groupRow(one, camera));
        if (rows.length > 0) this.show(element("ul", { class: "settings-list" }, ...rows));
        else this.show(emptyState("camera", kNone, linkButton("Add the first group", add, true)));
      },
    );
  }
}

function groupRow({ id, name, camera, deniedTo }: GroupRecord, cameras: readonly Named[]): HTMLElement {
  const names = cameras.filter((one) => camera.includes(one.id)).map((one) => one.name);
  return element(
    "li",
    { class: "card record-row" },
    element("a", { class: "row-link", href: settingsAddress("groups", id) }, name),
    element("span", { class: "quiet" }, names.join(", ") || "no camera"),
    element("span", { class: "quiet" }, deniedTo.length > 0 ? `denied to ${deniedTo.join(", ")}` : ""),
  );
}
