// SPDX-License-Identifier: Apache-2.0
//
// Two people have changed the same record: which settings differ, and what the record is with the changes of both.

/** Whether two values of JSON are the same, whatever the order of their names. */
export function isSame(one: unknown, other: unknown): boolean {
  if (typeof one !== "object" || typeof other !== "object" || !one || !other) return one === other;
  if (Array.isArray(one) !== Array.isArray(other)) return false;
  const names = Object.keys(one);
  if (names.length !== Object.keys(other).length) return false;
  return names.every((name) => name in other && isSame(one[name as never], other[name as never]));
}

/** The settings that are other than in `base`. */
export function changedFrom<Settings extends object>(base: Settings, mine: Settings): Partial<Settings> {
  const names = Object.keys(mine) as (keyof Settings)[];
  const changed = names.filter((name) => !isSame(base[name], mine[name]));
  return Object.fromEntries(changed.map((name) => [name, mine[name]])) as Partial<Settings>;
}

export interface Difference<Settings> {
  name: keyof Settings;
  /** Whether I have changed it, too; else only they have. */
  isMine: boolean;
}

/** What of `mine` and `theirs`, both made from `base`, is not the same. */
export function differences<Settings extends object>(
  base: Settings,
  mine: Settings,
  theirs: Settings,
): Difference<Settings>[] {
  const ofMine = changedFrom(base, mine);
  return (Object.keys(mine) as (keyof Settings)[])
    .filter((name) => !isSame(mine[name], theirs[name]))
    .map((name) => ({ name, isMine: name in ofMine }));
}

/** Theirs, with what I have changed. */
export function merged<Settings extends object>(base: Settings, mine: Settings, theirs: Settings): Settings {
  return { ...theirs, ...changedFrom(base, mine) };
}
