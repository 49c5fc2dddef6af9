// SPDX-License-Identifier: Apache-2.0
//
// One short message at the bottom of the window, announced to screen readers, gone after a while.

import { element } from "./dom";

const kShownMs = 5_000;

const box = element("div", { class: "notice", role: "status" });
let timer: ReturnType<typeof setTimeout> | undefined;

export function notify(message: string): void {
  if (!box.isConnected) document.body.append(box);
  box.textContent = message;
  box.classList.add("shown");
  clearTimeout(timer);
  timer = setTimeout(hideNotice, kShownMs);
}

export function hideNotice(): void {
  box.classList.remove("shown");
}
