// SPDX-License-Identifier: Apache-2.0
//
// The whole page goes full screen, so that the user can go from camera to camera there; the style sheets leave only
// pictures.

import { iconButton } from "./button";

export function toggleFullScreen(): void {
  // Refused where the browser has none: then nothing changes.
  const change = document.fullscreenElement
    ? document.exitFullscreen()
    : document.documentElement.requestFullscreen?.();
  change?.catch(() => undefined);
}

/** Hidden where the browser has no full screen, as on some phones. */
export function fullScreenButton(): HTMLButtonElement {
  const button = iconButton("fullScreen", "Full screen", toggleFullScreen, "F");
  button.hidden = !document.fullscreenEnabled;
  return button;
}
