// SPDX-License-Identifier: Apache-2.0
//
// While the events are on the screen, what is reported is no news to the user; what was reported before is told once.

import type { Alerts } from "../../wire/alerts";
import { notify } from "../widgets/notice";

/** Until `closed` is aborted. */
export function tellNewEvents(alerts: Alerts, closed: AbortSignal): void {
  const look = () => (document.hidden ? 0 : alerts.look());
  const tell = () => {
    const count = look();
    if (count > 0) notify(`${count} new since you looked.`);
  };
  document.addEventListener("visibilitychange", tell, { signal: closed });
  tell();
  alerts.listen(look, closed);
}
