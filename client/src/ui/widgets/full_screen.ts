// SPDX-License-Identifier: Apache-2.0
//
// The whole page goes full screen, so that the user can go from camera to camera there.

export function toggleFullScreen(): void {
  // Refused where the browser has none: then nothing changes.
  const change = document.fullscreenElement
    ? document.exitFullscreen()
    : document.documentElement.requestFullscreen?.();
  change?.catch(() => undefined);
}
