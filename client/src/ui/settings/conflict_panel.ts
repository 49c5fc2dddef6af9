// SPDX-License-Identifier: Apache-2.0
//
// Says that someone else has changed a record meanwhile, shows both, and lets the user choose whose changes stay.

import { button } from "../widgets/button";
import { element } from "../widgets/dom";
import { plainTable } from "../widgets/table";
import { differences } from "./merge";

/** The name of each setting, and its value in words. */
export type Descriptions<Settings> = {
  [Name in keyof Settings]: readonly [label: string, text: (value: Settings[Name]) => string];
};

export interface ConflictChoices {
  keepMine(): void;
  takeTheirs(): void;
}

/** `mine` was made from `base`; `theirs` is what the server has now. */
export function conflictPanel<Settings extends object>(
  noun: string,
  base: Settings,
  mine: Settings,
  theirs: Settings,
  describe: Descriptions<Settings>,
  choices: ConflictChoices,
): HTMLElement {
  const cell = (text: string) => element("td", {}, text || "none");
  const rows = differences(base, mine, theirs).map(({ name, isMine }) => {
    const [label, text] = describe[name];
    const own = isMine ? text(mine[name]) : "not changed by you";
    return element("tr", {}, element("th", { scope: "row" }, label), cell(own), cell(text(theirs[name])));
  });
  const said = `Someone else has changed this ${noun} since you opened it. Your changes are not saved yet.`;
  return element(
    "section",
    { class: "form-conflict", role: "alert" },
    element("p", {}, said),
    ...(rows.length > 0 ? [plainTable(["Setting", "Yours", "Theirs"], rows)] : []),
    element(
      "div",
      { class: "form-buttons" },
      button("Overwrite with mine", choices.keepMine),
      button("Discard mine", choices.takeTheirs),
    ),
  );
}
