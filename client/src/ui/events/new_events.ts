// SPDX-License-Identifier: Apache-2.0
//
// While the events are on the screen, what is reported is no news to the user; what was reported before is told once.

import type { Alerts } from "../../wire/alerts";
import { notify } from "../widgets/notice";
import { newsText } from "./news_text";

/** Until `closed` is aborted. */
export function tellNewEvents(alerts: Alerts, closed: AbortSignal): void {
  const look = () => (document.hidden ? "" : newsText(alerts.look()));
  const tell = () => {
    const text = look();
    if (text) notify(`${text}.`);
  };
  document.addEventListener("visibilitychange", tell, { signal: closed });
  tell();
  alerts.listen(look, closed);
}
