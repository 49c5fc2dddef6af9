// SPDX-License-Identifier: Apache-2.0
//
// While the events are on the screen, what is reported is no news to the user; what was reported before is told once.

import type { Alerts } from "../../wire/alerts";
import { notify } from "../widgets/notice";
import { newsText } from "./news_text";

/** Until `closed` is aborted. */
export function tellNewEvents(alerts: Alerts, closed: AbortSignal): void {
  let isTold = false;
  const look = () => {
    if (document.hidden || !alerts.isCaughtUp) return;
    const isFirst = !isTold;
    // Set first: `look` calls this listener again.
    isTold = true;
    const text = newsText(alerts.look());
    if (text && isFirst) notify(`${text}.`);
  };
  const follow = () => {
    isTold &&= !document.hidden;
    look();
  };
  document.addEventListener("visibilitychange", follow, { signal: closed });
  look();
  alerts.listen(look, closed);
}
