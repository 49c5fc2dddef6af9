// SPDX-License-Identifier: Apache-2.0
//
// When the browser is to notify the user, and of what.

import { AlertNotifications } from "../../../../client/src/ui/screens/alert_notifications";
import { Alerts } from "../../../../client/src/wire/alerts";
import type { RawMark } from "../../../../client/src/wire/footage";

const kMark = { id: 7, kind: "alert", camera_id: 2, text: ["Door open", "x".repeat(500)] } as unknown as RawMark;

class FakeNotification {
  static permission = "default";
  static answer = "granted";
  static shown: FakeNotification[] = [];
  onclick = () => undefined;
  constructor(
    readonly title: string,
    readonly options: { body: string; tag: string },
  ) {
    if (title.includes("Forbidden")) throw new TypeError("Illegal constructor");
    FakeNotification.shown.push(this);
  }
  static async requestPermission() {
    return (FakeNotification.permission = FakeNotification.answer);
  }
  close = vi.fn();
}

const kept = new Map<string, string>();
const page = { hidden: true, hasFocus: () => false };
const location = { hash: "" };

beforeEach(() => {
  kept.clear();
  Object.assign(FakeNotification, { permission: "default", answer: "granted", shown: [] });
  Object.assign(page, { hidden: true, hasFocus: () => false });
  vi.stubGlobal("Notification", FakeNotification);
  vi.stubGlobal("isSecureContext", true);
  vi.stubGlobal("document", page);
  vi.stubGlobal("location", location);
  vi.stubGlobal("window", { focus: vi.fn() });
  vi.stubGlobal("localStorage", {
    getItem: (key: string) => kept.get(key) ?? null,
    setItem: (key: string, value: string) => void kept.set(key, value),
    removeItem: (key: string) => void kept.delete(key),
  });
});
afterEach(() => void vi.unstubAllGlobals());

/** `act` is called before the session ends. */
async function report(notifications: AlertNotifications, isFresh = true, nameOf = async () => "Yard", times = 1, act: () => void = () => undefined) {
  const alerts = new Alerts();
  const ending = new AbortController();
  notifications.follow(alerts, nameOf, ending.signal);
  for (let i = 0; i < times; ++i) alerts.note(kMark, isFresh);
  await new Promise((done) => setTimeout(done));
  act();
  ending.abort();
  alerts.note(kMark, true);
  await new Promise((done) => setTimeout(done));
  return FakeNotification.shown.map(({ title }) => title);
}

test.each<[string, () => void, boolean, string[]]>([
  ["another program has the focus", () => (page.hidden = false), true, ["Yard: Alert"]],
  ["the page is hidden", () => undefined, true, ["Yard: Alert"]],
  ["the user looks at the page", () => Object.assign(page, { hidden: false, hasFocus: () => true }), true, []],
  ["it was missed, long ago", () => undefined, false, []],
  ["the permission was taken back", () => (FakeNotification.permission = "denied"), true, []],
  ["there is no HTTPS", () => vi.stubGlobal("isSecureContext", false), true, []],
])("notifies only where wanted: %s", async (_name, change, isFresh, expected) => {
  const notifications = new AlertNotifications(1);
  expect(await notifications.turnOn()).toBe(true);
  change();
  expect(await report(notifications, isFresh)).toEqual(expected);
});

test("is off until turned on, for each account by itself, and where the browser refuses", async () => {
  expect(await report(new AlertNotifications(1))).toEqual([]);
  FakeNotification.answer = "denied";
  expect([await new AlertNotifications(1).turnOn(), new AlertNotifications(1).areOn]).toEqual([false, false]);
  FakeNotification.answer = "granted";
  await new AlertNotifications(1).turnOn();
  expect([new AlertNotifications(1).areOn, new AlertNotifications(2).areOn]).toEqual([true, false]);
  new AlertNotifications(1).turnOff();
  expect(new AlertNotifications(1).areOn).toBe(false);
});

test("a click opens the event; one of a camera replaces another; no name and no constructor are no error", async () => {
  const notifications = new AlertNotifications(1);
  await notifications.turnOn();
  const click = () => void FakeNotification.shown[0]!.onclick();
  expect(await report(notifications, true, () => Promise.reject(new Error("away")), 2, click)).toEqual(["Alert", "Alert"]);
  const [one, other] = FakeNotification.shown;
  expect(one!.options.tag).toBe(other!.options.tag);
  expect(one!.options.body.length).toBe(200);
  expect([location.hash, one!.close.mock.calls.length]).toEqual(["#alert=7", 2]);
  location.hash = "";
  other!.onclick();
  expect([location.hash, other!.close.mock.calls.length], "gone with the session").toEqual(["", 1]);
  expect(await report(notifications, true, async () => "Forbidden")).toEqual(["Alert", "Alert"]);
});
