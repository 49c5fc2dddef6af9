// SPDX-License-Identifier: Apache-2.0
//
// Notifications of the browser for what is reported while the user looks at another page or program. Each account of a
// browser turns them on for itself.

import type { Alerts } from "../../wire/alerts";
import type { RawMark } from "../../wire/footage";

type Mark = Pick<RawMark, "id" | "kind" | "camera_id" | "text">;

const kKinds: Record<RawMark["kind"], string> = { alert: "Alert", pos: "POS transaction" };
const kMaxTextLength = 200;

export class AlertNotifications {
  readonly #key: string;

  constructor(userId: number) {
    this.#key = `lookhaven.notifications.${userId}`;
  }

  /** Browsers have them over HTTPS alone. */
  static get arePossible(): boolean {
    return typeof Notification === "function" && isSecureContext;
  }

  get areOn(): boolean {
    return AlertNotifications.arePossible && Notification.permission === "granted" && localStorage.getItem(this.#key) !== null;
  }

  /** Asks the user for the browser's permission; false where it is not given. */
  async turnOn(): Promise<boolean> {
    if ((await Notification.requestPermission()) !== "granted") return false;
    localStorage.setItem(this.#key, "on");
    return true;
  }

  turnOff(): void {
    localStorage.removeItem(this.#key);
  }

  /** Until `signal` is aborted. `cameraName` is asked for each notification; its failure leaves the name out. */
  follow(alerts: Alerts, cameraName: (id: number) => Promise<string>, signal: AbortSignal): void {
    const show = async (mark: Mark) => {
      if (!this.areOn || (!document.hidden && document.hasFocus())) return;
      const name = await cameraName(mark.camera_id).catch(() => "");
      if (!signal.aborted) notifyOf(mark, name, signal);
    };
    alerts.listenFresh((mark) => void show(mark), signal);
  }
}

/** The newest of a camera replaces the one before, so that a busy night does not fill the screen. */
function notifyOf({ id, kind, camera_id, text }: Mark, name: string, signal: AbortSignal): void {
  const title = name ? `${name}: ${kKinds[kind]}` : kKinds[kind];
  try {
    const made = new Notification(title, { body: text.join("\n").slice(0, kMaxTextLength), tag: `lookhaven-camera-${camera_id}` });
    // Nothing of an account stays after its session.
    signal.addEventListener("abort", () => made.close());
    made.onclick = () => {
      if (signal.aborted) return;
      window.focus();
      location.hash = `#${kind}=${id}`;
      made.close();
    };
  } catch {
    // Some browsers of phones show those of service workers alone.
  }
}
