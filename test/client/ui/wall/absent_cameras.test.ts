// SPDX-License-Identifier: Apache-2.0
//
// Why a camera that was on the wall is not listed any more.

import { AbsentCameras } from "../../../../client/src/ui/wall/absent_cameras";
import type { Camera, CameraList } from "../../../../client/src/wire/camera";

/** Of cameras with these ids, `CamNum` that there are, those that are disabled included. */
function listed(ids: number[], CamNum: number, isManager = true): CameraList {
  const camera = ids.map((id) => ({ id, name: `${id}` }) as Camera);
  return { camera, selected: 0, isManager, ShowAll: 1, CamNum, EnableCamNum: ids.length };
}

test.each<[string, CameraList[], string[]]>([
  ["all are there", [listed([1, 2], 2), listed([1, 2], 2)], []],
  ["one is disabled", [listed([1, 2], 2), listed([1], 2)], ["2 Disabled"]],
  ["one is removed", [listed([1, 2], 2), listed([1], 1)], ["2 Removed"]],
  ["a viewer cannot tell that from a denial", [listed([1, 2], 2, false), listed([1], 1, false)], ["2 Removed, or denied to you"]],
  ["of two, one each", [listed([1, 2, 3], 3), listed([1], 2)], ["2 Disabled or removed", "3 Disabled or removed"]],
  ["it comes back", [listed([1, 2], 2), listed([1], 2), listed([1, 2], 2)], []],
  ["it stays away", [listed([1, 2], 2), listed([1], 2), listed([1], 1)], ["2 Disabled"]],
])("%s", (_name, lists, absent) => {
  const cameras = new AbsentCameras();
  for (const list of lists) cameras.update(list);
  expect(cameras.all.map(({ camera, reason }) => `${camera.id} ${reason}`)).toEqual(absent);
});
