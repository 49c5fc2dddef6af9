// SPDX-License-Identifier: Apache-2.0
//
// The account's preferences: read once, after the log-in, then known at once; changes are sent to the server a moment
// later.
//
// Why so        On the server it follows the account to every browser, and stays apart where two accounts share one. A
//               server that fails holds nobody up: a session without what was preferred is better than none.
//               What belongs to one browser alone stays there: notifications (alert_notifications). Sound and full
//               screen take a click each time, without which browsers allow neither.
//               Records, named saved.…, are another matter: a user who saves one must know whether the server took it,
//               and those of other tabs and browsers are to be seen.
// Invariants    (1) Only what was changed here is told, by name: what another tab changes stays.
//               (2) It is told for the account that was asked for: once somebody else has logged in in another tab,
//                   the server refuses it.

import { forgetKeptByBrowser, keptByBrowser } from "./browser_preferences";
import { asServerError, type Server } from "./server";

const kApi = "VEXO.User";
const kTimeoutMs = 5_000;
/** What changes in quick succession is told at once. */
const kDebounceMs = 1_000;
const kRecord = /^saved\./;

type Values = Record<string, unknown>;

export class Preferences {
  readonly #server: Server;
  readonly #user: number;
  readonly #values: Values;
  /** Those of them that the server has not taken. */
  #changes: Values = {};
  #takesOver = false;
  #debounce: ReturnType<typeof setTimeout> | undefined;
  #telling: Promise<void> = Promise.resolve();
  #isTelling = false;
  #saving: Promise<void> = Promise.resolve();
  readonly #closing = new AbortController();

  private constructor(server: Server, user: number, values: Values) {
    this.#server = server;
    this.#user = user;
    this.#values = values;
    // A page that is left may get no other moment.
    const { signal } = this.#closing;
    document.addEventListener("visibilitychange", () => void (document.hidden && this.flush()), { signal });
    addEventListener("pagehide", () => void this.flush(), { signal });
  }

  /** Those of the session's account. Never rejects: where the server does not say, there are none. */
  static async load(server: Server, user: number): Promise<Preferences> {
    const how = { json: {}, quiet: true, timeoutMs: kTimeoutMs };
    const answer = server.call<{ preferences?: Values }>(kApi, "Preferences", {}, how);
    const values = await answer.then(({ preferences }) => preferences, () => undefined);
    const preferences = new Preferences(server, user, { ...values });
    if (values) preferences.#takeOver();
    return preferences;
  }

  /** Undefined for what was never chosen. Of any type: an older or newer client may have written it. */
  get(name: string): unknown {
    return this.#values[name];
  }

  set(name: string, value: unknown): void {
    if (JSON.stringify(value) === JSON.stringify(this.#values[name])) return;
    this.#values[name] = this.#changes[name] = value;
    clearTimeout(this.#debounce);
    this.#debounce = setTimeout(() => void this.flush(), kDebounceMs);
  }

  /** The names of all that was chosen or saved. */
  get names(): string[] {
    return Object.keys(this.#values);
  }

  /**
   * Tells these records at once, null for one to remove, and has them, and those of other tabs, once the server does.
   * Rejects with a ServerError where it does not: then nothing has changed here. None overtakes another.
   */
  save(records: Values): Promise<void> {
    const saved = this.#saving.then(async () => {
      const json = { id: this.#user, preferences: records };
      const how = { json, timeoutMs: kTimeoutMs, signal: this.#closing.signal };
      const answer = await this.#server.call<{ preferences?: Values } | null>(kApi, "SetPreferences", {}, how);
      this.#takeRecords(answer?.preferences ?? { ...this.#values, ...records });
    });
    this.#saving = saved.catch(() => undefined);
    return saved;
  }

  /** Has the records of other tabs and browsers as well. Never rejects: without an answer all stays as it is. */
  refresh(): Promise<void> {
    // Asked for in this way, none of another account are given.
    return this.save({}).catch(() => undefined);
  }

  /** Begins at once unless it is being told already: none overtakes another. Resolves when done; never rejects. */
  flush(): Promise<void> {
    return (this.#telling = this.#isTelling ? this.#telling.then(() => this.#tell()) : this.#tell());
  }

  /** The session is over: what was not told is lost. */
  close(): void {
    clearTimeout(this.#debounce);
    this.#closing.abort();
    this.#changes = {};
  }

  async #tell(): Promise<void> {
    clearTimeout(this.#debounce);
    const changes = this.#changes;
    if (Object.keys(changes).length === 0) return;
    this.#changes = {};
    this.#isTelling = true;
    const json = { id: this.#user, preferences: changes };
    try {
      const how = { json, quiet: true, keepalive: true, timeoutMs: kTimeoutMs };
      await this.#server.call<unknown>(kApi, "SetPreferences", {}, how);
    } catch (error) {
      const { status } = asServerError(error);
      // What could not be told is told with the next change; what was refused would be refused again.
      if (status === 0 || status === 429 || status >= 500) {
        if (!this.#closing.signal.aborted) this.#changes = { ...changes, ...this.#changes };
      }
      // Only what can never be taken is given up.
      if (status !== 400) return;
    } finally {
      this.#isTelling = false;
    }
    if (this.#takesOver) forgetKeptByBrowser();
  }

  #takeRecords(values: Values): void {
    for (const name of this.names) if (kRecord.test(name)) delete this.#values[name];
    for (const [name, value] of Object.entries(values)) {
      if (kRecord.test(name) && value !== null) this.#values[name] = value;
    }
  }

  #takeOver(): void {
    this.#takesOver = true;
    for (const [name, value] of Object.entries(keptByBrowser())) if (!(name in this.#values)) this.set(name, value);
    if (Object.keys(this.#changes).length === 0) forgetKeptByBrowser();
  }
}
