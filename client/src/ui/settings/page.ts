// SPDX-License-Identifier: Apache-2.0
//
// What the pages of the settings have in common: how the screen deals with them, and how they look while there is
// nothing to show.

import { keepTrying } from "../../wire/keep_trying";
import { asServerError, type Account, type Server, type ServerError } from "../../wire/server";
import { element } from "../widgets/dom";
import { icon, type IconName } from "../widgets/icons";
import type { Draft } from "./draft";

export interface Page {
  readonly root: HTMLElement;
  /** Whether something would be lost by leaving. */
  readonly isChanged: boolean;
  /** What can be restored after the session has ended. */
  readonly draft: Draft | null;
  /** Ends all that the page has running. */
  close(): void;
}

/** What a page is opened with. */
export interface PageContext {
  readonly server: Server;
  readonly account: Account;
  /** What an earlier page of the same address left. */
  readonly draft: Draft | null;
  /** Goes from a record to the list that it is in, once the user agrees to lose changes. */
  readonly leave: () => void;
  /** The same, unasked. */
  readonly done: () => void;
}

/** A page that is filled when the server has answered. */
export abstract class LoadedPage<Data> implements Page {
  readonly root = element("div", { class: "settings-content" });
  protected readonly context: PageContext;
  readonly #heading: HTMLElement;
  readonly #body = element("div", { class: "settings-loaded" });
  readonly #closing = new AbortController();

  /** `action` stands beside the heading. */
  constructor(context: PageContext, title: string, action?: Node) {
    this.context = context;
    this.#heading = element("h2", { tabindex: "-1" }, title);
    const head = element("header", { class: "settings-head" }, this.#heading);
    if (action) head.append(element("span", { class: "bar-gap" }), action);
    this.root.append(head, this.#body);
  }

  get isChanged(): boolean {
    return false;
  }

  /** Until the page is filled, what it was opened with. */
  get draft(): Draft | null {
    return this.context.draft;
  }

  /** Ends requests and timers. */
  close(): void {
    this.#closing.abort();
  }

  protected get closed(): AbortSignal {
    return this.#closing.signal;
  }

  /** Leads from a record to the list that it is in. */
  protected linkBack(label: string, href: string): void {
    this.#heading.before(element("a", { class: "icon-button", href, "aria-label": label, title: label }, icon("back")));
  }

  protected set title(text: string) {
    this.#heading.textContent = text;
  }

  protected show(...content: Node[]): void {
    this.#body.replaceChildren(...content);
  }

  /** Shows what the server has; until it answers, why there is nothing. */
  protected async start(ask: () => Promise<Data>, show: (data: Data) => void): Promise<void> {
    this.show(loadingState("Loading…"));
    const forManagers = () =>
      ask().catch((error: ServerError) => {
        if (error.status === 403) return null;
        throw error;
      });
    const data = await keepTrying(forManagers, (sentence) => this.show(loadingState(sentence)), this.closed);
    if (data === undefined) return;
    if (data === null) this.show(noRightState());
    else show(data);
  }

  /** Asks again at this interval while the page is seen; a failure changes nothing. */
  protected refresh(intervalMs: number, ask: () => Promise<Data>, show: (data: Data) => void): void {
    const timer = setInterval(async () => {
      if (document.hidden) return;
      const data = await ask().catch((error: unknown) => void asServerError(error));
      if (data && !this.closed.aborted) show(data);
    }, intervalMs);
    this.closed.addEventListener("abort", () => clearInterval(timer));
  }
}

function loadingState(sentence: string): HTMLElement {
  const text = element("p", { role: "status" }, sentence);
  return element("div", { class: "settings-state" }, element("div", { class: "spinner" }), text);
}

export function emptyState(name: IconName, sentence: string, ...actions: Node[]): HTMLElement {
  return element("div", { class: "settings-state" }, icon(name), element("p", {}, sentence), ...actions);
}

export function noRightState(): HTMLElement {
  return emptyState("warning", "Only managers of this system may see and change its settings.");
}
