// SPDX-License-Identifier: Apache-2.0
//
// Which camera watches something.

import type { Named } from "../../../wire/camera_setup";
import { selectField, type Field } from "../../widgets/fields";

/** `current` is offered even where it is none of `cameras`, as a camera of a paired host is. */
export function cameraField(label: string, cameras: readonly Named[], current: number): Field<number> {
  const known = cameras.some(({ id }) => id === current) || current === 0;
  const choices = [{ id: 0, name: "none" }, ...cameras, ...(known ? [] : [{ id: current, name: `camera ${current}` }])];
  const field = selectField(
    label,
    choices.map(({ id, name }) => [String(id), name]),
  );
  field.value = String(current);
  return {
    root: field.root,
    get value() {
      return Number(field.value);
    },
    set value(id: number) {
      field.value = String(id);
    },
  };
}
