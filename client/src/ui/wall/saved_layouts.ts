// SPDX-License-Identifier: Apache-2.0
//
// The account's saved layouts of the wall, and the sequences of them.
//
// Why so        Each is a record of its own among the account's preferences, so that of two tabs that save different
//               ones neither loses any. A sequence names its layouts by ids, which stay when a layout gets another
//               name; what is deleted is skipped when the sequence is read.
// Invariants    Whatever the server sends, no getter throws, and all that they give is within the limits below. What is
//               not, another version may have written: it is left alone.

import type { Preferences } from "../../wire/preferences";
import { asServerError, ServerError } from "../../wire/server";
import { kLayoutChoices, type LayoutChoice } from "./layout";

export const kMaxNameLength = 64;
export const kMinDwellS = 5;
export const kMaxDwellS = 600;

export type SavedKind = "layout" | "sequence";
/** The server keeps 64 preferences of an account. */
export const kMaxSaved: Record<SavedKind, number> = { layout: 32, sequence: 16 };

export interface SavedLayout {
  readonly id: string;
  readonly name: string;
  readonly grid: LayoutChoice;
  /** Ids, in order. Some may be of cameras that are gone, or that the account may not see. */
  readonly cameras: readonly number[];
}

export interface Sequence {
  readonly id: string;
  readonly name: string;
  /** How long each layout is shown, in seconds. */
  readonly dwellS: number;
  /** Ids of layouts that there are, in order. */
  readonly layouts: readonly string[];
}

export class SavedLayouts {
  readonly #preferences: Preferences;
  readonly #changed: () => void;

  /** `changed` is called when they may be others than before. */
  constructor(preferences: Preferences, changed: () => void) {
    this.#preferences = preferences;
    this.#changed = changed;
  }

  /** By name, as `sequences` are. */
  get layouts(): SavedLayout[] {
    return this.#all("layout", layoutOf);
  }

  get sequences(): Sequence[] {
    const ids = new Set(this.layouts.map(({ id }) => id));
    return this.#all("sequence", (id, value) => sequenceOf(id, value, ids));
  }

  /** Has those of other tabs and browsers as well. Never rejects. */
  async refresh(): Promise<void> {
    await this.#preferences.refresh();
    this.#changed();
  }

  /** Why a layout or sequence cannot be saved under this name; empty where it can. `id` is its own. */
  nameProblem(kind: SavedKind, name: string, id: string): string {
    const all: readonly { id: string; name: string }[] = kind === "layout" ? this.layouts : this.sequences;
    const isTaken = all.some((one) => one.id !== id && one.name.toLowerCase() === name.toLowerCase());
    if (name === "") return `Please give the ${kind} a name.`;
    if ([...name].length > kMaxNameLength) return `A name has at most ${kMaxNameLength} characters.`;
    if (isTaken) return `There is a ${kind} of this name already.`;
    if (all.length < kMaxSaved[kind] || all.some((one) => one.id === id)) return "";
    return `There are ${kMaxSaved[kind]} ${kind}s already. Delete one first.`;
  }

  /** In place of the one with the same id. Rejects with a ServerError where the server does not take it. */
  saveLayout({ id, ...layout }: SavedLayout): Promise<void> {
    return this.#save("layout", id, layout);
  }

  saveSequence({ id, ...sequence }: Sequence): Promise<void> {
    return this.#save("sequence", id, sequence);
  }

  async remove(kind: SavedKind, id: string): Promise<void> {
    await this.#preferences.save({ [nameOf(kind, id)]: null });
    this.#changed();
  }

  async #save(kind: SavedKind, id: string, value: Omit<SavedLayout, "id"> | Omit<Sequence, "id">): Promise<void> {
    await this.#preferences.save({ [nameOf(kind, id)]: value }).catch((error: unknown) => {
      const { status, code, message } = asServerError(error);
      const hint = "The account has no room for this. Delete a layout or a sequence first.";
      throw new ServerError(status, code, status === 400 ? hint : message);
    });
    this.#changed();
  }

  #all<One extends { name: string }>(kind: SavedKind, read: (id: string, value: unknown) => One | null): One[] {
    const prefix = nameOf(kind, "");
    const names = this.#preferences.names.filter((name) => name.startsWith(prefix));
    const all = names.flatMap((name) => read(name.slice(prefix.length), this.#preferences.get(name)) ?? []);
    return all.sort((one, other) => one.name.localeCompare(other.name, undefined, { numeric: true }));
  }
}

function nameOf(kind: SavedKind, id: string): string {
  return `saved.${kind}.${id}`;
}

/** For a layout or sequence that is not saved yet: an attempt that is repeated saves it once. */
export function newId(): string {
  return [...crypto.getRandomValues(new Uint8Array(4))].map((byte) => byte.toString(16).padStart(2, "0")).join("");
}

/** Those of the array, each once; none where it is no array. */
function distinct<Item>(value: unknown, isItem: (item: unknown) => item is Item): Item[] {
  return Array.isArray(value) ? [...new Set(value.filter(isItem))] : [];
}

const isCameraId = (item: unknown): item is number => Number.isSafeInteger(item);

/** Null where there is nothing that can be listed: the id stands in addresses. */
function membersOf(id: string, value: unknown): (Record<string, unknown> & { name: string }) | null {
  if (!/^[\w-]{1,40}$/.test(id) || typeof value !== "object" || value === null) return null;
  const { name } = value as Record<string, unknown>;
  if (typeof name !== "string" || name.trim() === "" || [...name].length > kMaxNameLength) return null;
  return { ...value, name };
}

function layoutOf(id: string, value: unknown): SavedLayout | null {
  const members = membersOf(id, value);
  const cameras = distinct(members?.["cameras"], isCameraId);
  if (!members || cameras.length === 0) return null;
  const grid = kLayoutChoices.find((choice) => choice === members["grid"]) ?? "auto";
  return { id, name: members.name, grid, cameras };
}

function sequenceOf(id: string, value: unknown, known: ReadonlySet<string>): Sequence | null {
  const members = membersOf(id, value);
  const dwellS = members?.["dwellS"];
  if (!members || typeof dwellS !== "number") return null;
  const isKnown = (item: unknown): item is string => typeof item === "string" && known.has(item);
  const within = Math.min(Math.max(dwellS, kMinDwellS), kMaxDwellS);
  return { id, name: members.name, dwellS: within, layouts: distinct(members["layouts"], isKnown) };
}
