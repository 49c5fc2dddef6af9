// SPDX-License-Identifier: Apache-2.0
//
// Rights as they are edited and told: what an account is denied, in one order and in words.

import {
  byRight,
  kCameraRights,
  type CameraRight,
  type Denied,
  type UserList,
  type UserRecord,
  type UserSettings,
} from "../../../wire/accounts";

export const kRightNames: Record<CameraRight, string> = {
  live: "Live",
  audio: "Sound",
  playback: "Playback",
  export: "Export",
};
export const kPrivilegeNames: Record<UserSettings["privilege"], string> = { viewer: "Viewer", manager: "Manager", owner: "Owner" };

const inOrder = (ids: readonly number[]) => [...new Set(ids)].sort((one, other) => one - other);

function eachRight(denied: Record<CameraRight, number[]>): Record<CameraRight, number[]> {
  return byRight((right) => inOrder(denied[right]));
}

export const kNothingDenied: Denied = {
  ...byRight(() => []),
  group: byRight(() => []),
  emap: [],
  door: [],
  ioModule: [],
};

/** The same in one order, so that two can be compared. */
export function ordered(deny: Denied): Denied {
  const { group, emap, door, ioModule } = deny;
  return { ...eachRight(deny), group: eachRight(group), emap: inOrder(emap), door: inOrder(door), ioModule: inOrder(ioModule) };
}

export function userSettingsOf({ privilege, mayMark, deny }: UserRecord): UserSettings {
  return { privilege, mayMark, deny: ordered(deny) };
}

/** Whether a camera's right is denied, by itself, with one of its groups or with the one that it takes. */
export function isDenied(deny: Denied, right: CameraRight, camera: number, groups: UserList["group"]): boolean {
  if (right === "export" && isDenied(deny, "playback", camera, groups)) return true;
  const ofGroup = groups.some((group) => group.camera.includes(camera) && deny.group[right].includes(group.id));
  return ofGroup || deny[right].includes(camera);
}

/** "everything", "no live: Gate, Yard; no maps: Ground floor". */
export function rightsText(deny: Denied, { camera, group, emap, door, ioModule }: UserList): string {
  const names = (ids: readonly number[], all: readonly { id: number; name: string }[]) =>
    all.filter(({ id }) => ids.includes(id)).map(({ name }) => name);
  const ofRight = kCameraRights.map((right) => {
    const denied = [...names(deny.group[right], group).map((name) => `group ${name}`), ...names(deny[right], camera)];
    return [`no ${kRightNames[right].toLowerCase()}`, denied] as const;
  });
  const others = [
    ["no maps", names(deny.emap, emap)],
    ["no doors", names(deny.door, door)],
    ["no I/O modules", names(deny.ioModule, ioModule)],
  ] as const;
  const said = [...ofRight, ...others].filter(([, denied]) => denied.length > 0);
  return said.length === 0 ? "everything" : said.map(([text, denied]) => `${text}: ${denied.join(", ")}`).join("; ");
}

/** "5 of 6 cameras, 2 of them without sound, without export": of the cameras that there are. */
export function rightsSummary(deny: Denied, { camera, group }: Pick<UserList, "camera" | "group">): string {
  const seen = camera.filter(({ id }) => !isDenied(deny, "live", id, group));
  if (seen.length === 0) return "no camera";
  const live = seen.length === camera.length ? "all cameras" : `${seen.length} of ${camera.length} cameras`;
  const without = (right: CameraRight, name: string) => {
    const count = seen.filter(({ id }) => isDenied(deny, right, id, group)).length;
    return count === 0 ? "" : `, ${count === seen.length ? "" : `${count} of them `}without ${name}`;
  };
  return `${live}${without("audio", "sound")}${without("export", "export")}`;
}
