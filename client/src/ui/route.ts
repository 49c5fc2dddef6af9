// SPDX-License-Identifier: Apache-2.0
//
// Which camera is open in the large view, kept in the address, so that a reload keeps it and "back" leaves it.

const kPattern = /^#camera=(\d+)$/;

/** The id of the open camera; null means the wall. */
export function openCamera(): number | null {
  const found = kPattern.exec(location.hash);
  return found ? Number(found[1]) : null;
}

/** Opens a camera. Going from one camera to the next leaves one entry in the history, not one for each. */
export function showCamera(id: number): void {
  if (openCamera() === null) history.pushState({ fromWall: true }, "", `#camera=${id}`);
  else history.replaceState(history.state, "", `#camera=${id}`);
  dispatchEvent(new PopStateEvent("popstate"));
}

export function showWall(): void {
  if (openCamera() === null) return;
  if ((history.state as { fromWall?: boolean } | null)?.fromWall) return history.back();
  history.replaceState(null, "", location.pathname + location.search);
  dispatchEvent(new PopStateEvent("popstate"));
}
