// SPDX-License-Identifier: Apache-2.0
//
// The settings in a real browser: nothing that was typed is lost, nobody's change is lost unseen, and nothing is
// deleted unasked.

import type { Page } from "playwright-core";
import { kNothingDenied } from "../../../../client/src/ui/settings/accounts/rights";
import { cameraRecord, kCode, kTokenSecret } from "../../support/fake_setup";
import { hasBrowser, ServedClient } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { setup } = client.server;

  beforeEach(() => {
    client.server.hasSession = client.server.isManager = true;
    client.server.isAway = false;
    setup.asked.length = 0;
    setup.camera.splice(0, Infinity, cameraRecord(1, "Entrance"), cameraRecord(2, "Gate"));
    const user = { revision: 1, mayMark: false, deny: kNothingDenied, sessions: 0, lastUse: null };
    setup.user.splice(0, Infinity, { ...user, id: 1, name: "admin", privilege: "owner" }, { ...user, id: 2, name: "guard", privilege: "viewer" });
  });

  const open = (section: string) => client.open(`${client.address}#settings=${section}`, 1024, 768);
  const save = (page: Page) => page.getByRole("button", { name: "Save", exact: true }).click();

  test("who is no manager has no settings", async () => {
    client.server.isManager = false;
    const page = await open("accounts");
    await page.getByText("Only managers").waitFor();
    expect(await page.locator(".nav").textContent()).toBe("LiveEventsMaps");
  });

  test("a camera is added when its picture was seen; a test can be given up, and fails with a reason", async () => {
    const page = await open("cameras&open=new");
    await page.getByLabel("Address", { exact: true }).fill("camera-3");
    await page.getByLabel("Common paths").selectOption({ index: 1 });
    await page.getByLabel("The camera's password").fill("secret");
    await page.route(/Probe/, () => undefined);
    const tryIt = page.getByRole("button", { name: "Test connection" });
    await tryIt.click();
    await page.getByRole("button", { name: "Cancel test" }).click();
    await page.unroute(/Probe/);
    setup.probe = { failed: "refused", message: "It refuses." };
    await tryIt.click();
    await page.getByText("It refuses.").waitFor();
    const picture = client.server.jpeg.toString("base64");
    setup.probe = { codec: "h264", width: 64, height: 36, rate: 25, audio: true, picture };
    await tryIt.click();
    await page.waitForFunction(() => document.querySelector<HTMLCanvasElement>(".probe-picture")?.width === 64);
    await page.getByLabel("Name").fill("Yard");
    await page.getByText("By the hour").click();
    await page.getByText("Never", { exact: true }).last().click();
    await page.locator(".plan-day", { hasText: "Su" }).click();
    await page.getByRole("gridcell", { name: /^Monday, 00/ }).focus();
    await page.keyboard.press("2");
    await page.keyboard.press("Shift+ArrowRight");
    const cell = (name: RegExp) => page.getByRole("gridcell", { name }).hover();
    await cell(/^Tuesday, 04/);
    await page.mouse.down();
    await cell(/^Wednesday, 05/);
    await page.mouse.up();
    await page.getByRole("button", { name: "Add the camera" }).click();
    await page.waitForURL(/#settings=cameras$/);
    const [, added] = setup.asked[0]!;
    const day = "1".repeat(24);
    const night = `${"1".repeat(4)}00${"1".repeat(18)}`;
    const hours = `00${"1".repeat(22)}${night}${night}${day.repeat(3)}${"0".repeat(24)}`;
    expect(added).toMatchObject({ name: "Yard", password: "secret", audio: true, source: [{ profile: 0, address: "rtsp://camera-3/stream1" }] });
    expect(added.plan).toMatchObject({ mode: "schedule", hours });
  }, 40_000);

  test("both changes are shown where someone else was faster, and the user chooses", async () => {
    const page = await open("cameras&open=2");
    await page.getByLabel("Name").fill("Gate north");
    expect(await page.evaluate(() => document.documentElement.scrollHeight), "the page scrolls, not the document").toBe(768);
    Object.assign(setup.camera[1]!, { revision: 7, name: "Gate south", audio: true });
    await save(page);
    const rows = page.locator(".form-conflict tbody tr");
    await rows.first().waitFor();
    expect(await rows.allInnerTexts()).toEqual(["Name\tGate north\tGate south", "Sound\tnot changed by you\tyes"]);
    await page.getByRole("button", { name: "Overwrite with mine" }).click();
    await page.getByText("The camera is saved.").waitFor();
    expect(setup.asked, "their other change stays, and so does the password").toEqual([["camera", { id: 2, revision: 7, name: "Gate north" }]]);
    await page.getByLabel("Name").fill("x");
    Object.assign(setup.camera[1]!, { revision: 20, name: "Gate east" });
    await save(page);
    await page.getByRole("button", { name: "Discard mine" }).click();
    expect(await page.getByLabel("Name").inputValue()).toBe("Gate east");
    let lists = 0;
    await page.route(/Camera&version=1&method=List/, (route) => ((lists += 1), route.continue()));
    await page.getByRole("button", { name: "Remove this camera…" }).dblclick();
    await page.getByRole("dialog", { name: "Remove Gate east?" }).waitFor();
    expect(lists, "a second click opens no second dialog").toBe(1);
  }, 20_000);

  test("what was typed outlives a server that is away, a change of mind and the end of the session, but for passwords", async () => {
    const page = await open("cameras&open=2");
    await page.getByLabel("Name").fill("Gate north");
    await page.getByLabel("The camera's password").fill("secret");
    client.server.isAway = true;
    await save(page);
    await page.getByText("Not saved. The server does not answer.").waitFor();
    client.server.isAway = false;
    let asked = 0;
    page.on("dialog", (dialog) => ((asked += 1), void dialog.dismiss()));
    for (const leave of [
      () => page.click(".settings-link >> nth=1"),
      () => page.getByRole("button", { name: "Cancel" }).click(),
      () => page.evaluate(() => location.reload()),
    ]) {
      await leave();
      await vi.waitFor(() => expect(new URL(page.url()).hash).toBe("#settings=cameras&open=2"), 5000);
    }
    expect(asked).toBe(3);
    client.server.hasSession = false;
    // Clicked at once or not at all: what the page asks for by itself may have found out already.
    await page.getByRole("button", { name: "Save", exact: true }).evaluateAll((buttons) => buttons.forEach((button) => (button as HTMLElement).click()));
    await page.getByLabel("Account", { exact: true }).fill("x");
    await page.getByLabel("Password").fill("x");
    await page.keyboard.press("Enter");
    await page.getByText("Your changes from before").waitFor();
    expect(await page.getByLabel("Name").inputValue()).toBe("Gate north");
    expect(await page.getByLabel("The camera's password").inputValue()).toBe("");
    const typeOn = () => page.getByLabel("Name").fill("Gate north 2");
    await page.route(/method=Set/, (route) => typeOn().then(() => route.continue()), { times: 1 });
    await save(page);
    await page.getByText("The camera is saved.").waitFor();
    expect(setup.asked).toEqual([["camera", { id: 2, revision: 1, name: "Gate north" }]]);
    expect(await page.getByLabel("Name").inputValue(), "typed while it was being saved").toBe("Gate north 2");
  }, 30_000);

  test("a host shows a code, and another is added by it, away, and removed with what goes along", async () => {
    setup.host.splice(0, Infinity);
    setup.whyNoHost = "";
    const page = await open("hosts");
    await page.getByText("No paired host yet.").waitFor();
    await page.getByRole("button", { name: "Show a code" }).click();
    const dialog = page.getByRole("dialog");
    await dialog.getByLabel("Name of the other host").fill("Office");
    await dialog.getByLabel("Your own password").fill("wrong");
    await page.keyboard.press("Enter");
    await dialog.getByText("The password is wrong.").waitFor();
    await dialog.getByLabel("Your own password").fill("right");
    await page.keyboard.press("Enter");
    expect(await page.getByRole("group", { name: "Code" }).textContent()).toBe(kCode.replaceAll("-", ""));
    await page.keyboard.press("Escape");
    await page.getByRole("button", { name: "Add a host" }).first().click();
    await dialog.getByLabel("Name", { exact: true }).fill("Warehouse");
    await dialog.getByLabel("Address").fill("https://nvr2.example:443/");
    const add = async (code: string, said: RegExp) => {
      await dialog.getByLabel("Code").fill(code);
      await dialog.getByRole("button", { name: "Add the host" }).click();
      await dialog.getByText(said).waitFor();
    };
    await add(kCode, /enter your password/);
    await dialog.getByLabel("Your own password").fill("wrong");
    await add(kCode, /The password is wrong/);
    await dialog.getByLabel("Your own password").fill("right");
    await add(kCode.replace("Z", "Y"), /typing error/);
    const refusals = [
      ["unreachable", /No Lookhaven host answers/],
      ["certificate", /was not sent/],
      ["code", /valid once/],
      ["tooMany", /compare it/],
      ["unclear", /same code/],
    ] as const;
    for (const [why, said] of refusals) {
      setup.whyNoHost = why;
      await add(kCode, said);
    }
    expect(await dialog.getByLabel("Address").inputValue(), "what was typed stays").toBe("https://nvr2.example:443/");
    setup.whyNoHost = "";
    setup.hostReplaced = { camera: [{ id: 7, idOnServer: 1, name: "Yard" }], denial: [{ user: "guard", kind: "camera", id: 7 }] };
    await add(kCode, /Warehouse is known .* guard: Yard/);
    expect(setup.host.length, "another one keeps its place until that is confirmed").toBe(0);
    await dialog.getByRole("button", { name: "Add the host" }).click();
    await page.locator(".record-head", { hasText: "answers" }).waitFor();
    await page.getByText("central management is off").waitFor();
    const asked = { name: "Warehouse", address: "nvr2.example", port: 443, code: kCode, reauth: "right", confirm: true };
    expect(setup.asked).toEqual([["Server.Add", asked]]);
    setup.hostReplaced = null;
    setup.whyNoHost = "its clock is 5 minutes behind";
    await page.evaluate(() => location.reload());
    await page.getByText("Its clock is 5 minutes behind.").waitFor();
    await page.getByRole("button", { name: "Remove Warehouse" }).click();
    setup.host[0]!.denial.push({ user: "guard", kind: "camera", id: 7 });
    await dialog.getByRole("button", { name: "Remove", exact: true }).click();
    await dialog.getByText("guard: Yard").waitFor();
    expect(setup.host.length, "nothing that was not seen goes").toBe(1);
    await dialog.getByRole("button", { name: "Remove", exact: true }).click();
    await page.getByText("No paired host yet.").waitFor();
  }, 30_000);

  test("a camera's new group is ticked; a group keeps the cameras that were removed", async () => {
    setup.group.splice(0, Infinity, { id: 3, revision: 1, name: "Yard", camera: [1, 99], deniedTo: ["guard"] });
    const page = await open("cameras&open=2");
    await page.getByRole("button", { name: "New group…" }).click();
    const dialog = page.getByRole("dialog", { name: "New group" });
    await dialog.getByLabel("Name").fill("Doors");
    await dialog.getByLabel("Name").press("Enter");
    await dialog.waitFor({ state: "detached" });
    await save(page);
    await page.getByText("The camera is saved.").waitFor();
    expect(setup.asked, "the dialog's form saves no camera").toEqual([
      ["Group.Add", { name: "Doors", camera: [] }],
      ["camera", { id: 2, revision: 1, group: [7] }],
    ]);
    setup.asked.length = 0;
    await page.evaluate(() => void (location.hash = "#settings=groups&open=3"));
    await page.getByText("Gate", { exact: true }).click();
    await save(page);
    await page.getByText("The group is saved.").waitFor();
    expect(setup.asked).toEqual([["group", { id: 3, revision: 1, camera: [1, 2, 99] }]]);
    await page.getByRole("button", { name: "Remove this group…" }).click();
    await page.getByText("It is denied to guard").waitFor();
    setup.group.length = 0;
  }, 20_000);

  test("a map that someone else has changed is renamed once the user has said so again", async () => {
    setup.emap.length = 0;
    const page = await open("maps");
    await page.getByText("There are no maps yet.").waitFor();
    const map = { id: 1, revision: 5, name: "Ground floor", picture: "", items: 2, linkedFrom: [] };
    setup.emap.push({ ...map });
    await page.reload();
    await page.getByRole("button", { name: "Rename Ground floor" }).click();
    Object.assign(setup.emap[0]!, { revision: 6, name: "Basement" });
    const dialog = page.getByRole("dialog", { name: "Rename Ground floor" });
    await dialog.getByLabel("Name").fill("Cellar");
    await dialog.getByRole("button", { name: "Rename" }).click();
    await dialog.getByText("Someone else has changed Basement").waitFor();
    expect(setup.asked).toEqual([]);
    await dialog.getByRole("button", { name: "Rename" }).click();
    await page.getByRole("heading", { name: "Cellar" }).waitFor();
    expect(setup.asked).toEqual([["emap", { id: 1, revision: 6, name: "Cellar" }]]);
  }, 20_000);

  test("rights are stored as what is denied; a new password takes the manager's own", async () => {
    const page = await open("accounts&open=2");
    await page.getByLabel("All cameras: Sound").click();
    await page.getByLabel("Entrance: Sound").click();
    await page.getByLabel("Group Outside: Live").click();
    await page.getByLabel("Entrance: Playback").click();
    expect(await page.getByLabel("Entrance: Export").getAttribute("title")).toBe("Denied with playback");
    await page.getByLabel("Entrance: Playback").click();
    expect(await page.getByLabel("Entrance: Export").getAttribute("title")).toBe("");
    await page.getByLabel("Entrance: Export").click();
    let answer = () => {};
    const isTyped = new Promise<void>((resolve) => (answer = resolve));
    await page.route(/VEXO\.User.*method=Set/, (route) => void isTyped.then(() => route.continue()), { times: 1 });
    await save(page);
    await page.getByLabel("New password").fill("long enough");
    await page.getByLabel("Repeat password").fill("long enough");
    await save(page);
    answer();
    const deny = { ...kNothingDenied, audio: [2], export: [1], group: { ...kNothingDenied.group, live: [1] } };
    await vi.waitFor(() => expect(setup.asked).toEqual([["user", { id: 2, revision: 1, deny }]]));
    const dialog = page.getByRole("dialog", { name: "Change guard" });
    for (const word of ["wrong", "right"]) {
      await dialog.getByLabel("Your own password").fill(word);
      await dialog.getByRole("button", { name: "Change" }).click();
      if (word === "wrong") await dialog.getByText("The password is wrong.").waitFor();
    }
    await vi.waitFor(() => expect(setup.asked[1]).toEqual(["user", { id: 2, revision: 2, password: "long enough", reauth: "right" }]));
    await vi.waitFor(async () => expect(await page.getByLabel("New password").inputValue()).toBe(""));
  }, 20_000);

  test("an access token is shown once, and goes after a question", async () => {
    setup.token.length = 0;
    const page = await open("accounts");
    await page.getByRole("button", { name: "Add a token…" }).click();
    const dialog = page.getByRole("dialog", { name: "Add an access token" });
    const add = dialog.getByRole("button", { name: "Add", exact: true });
    await dialog.getByLabel("Your own password").fill("right");
    await dialog.getByLabel("Name").fill("Till");
    await add.click();
    await dialog.getByText("Please choose a camera").waitFor();
    await dialog.getByText("Gate").click();
    await dialog.getByText("POS transactions", { exact: true }).click();
    await dialog.getByLabel("Expires").selectOption("in 90 days");
    await add.click();
    const shown = page.getByRole("dialog", { name: "The token Till" });
    await shown.getByText(kTokenSecret).waitFor();
    await shown.getByRole("button", { name: `Copy ${kTokenSecret}` }).click();
    await shown.getByRole("button", { name: "Close" }).last().click();
    const lifetime = 90 * 86_400;
    expect(setup.asked).toEqual([["Token.Add", { name: "Till", camera: [2], kind: ["pos"], lifetime, reauth: "right" }]]);
    await page.getByRole("rowheader", { name: "Till" }).waitFor();
    expect(await page.content()).not.toContain(kTokenSecret);
    for (const answer of ["Cancel", "Remove"]) {
      expect(setup.token.length).toBe(1);
      await page.getByRole("button", { name: "Remove the token Till" }).click();
      await page.getByRole("dialog", { name: "Remove the token Till?" }).getByRole("button", { name: answer }).click();
    }
    await page.getByRole("rowheader", { name: "Till" }).waitFor({ state: "detached" });
  }, 20_000);

  test("limits that delete footage are saved when the user has seen how much", async () => {
    const mount = { id: 1, revision: 1, name: "Disk", path: "/srv", shared: false, enabled: true, default: true, state: "ready", message: "", total: 9e11, free: 5e11, used: 4e11 };
    setup.mount.splice(0, Infinity, { ...mount, oldest: null, limit: { bytes: null, days: null }, perDay: 1e10, lastsDays: null, history: [], camera: [{ id: 9, name: "", perDay: 1e10 }] });
    setup.loss = { events: 12, bytes: 3e9, until: 1_790_000_000 };
    const page = await open("storage");
    await page.getByText("By camera (1)").click();
    await page.getByRole("rowheader", { name: "removed camera" }).waitFor();
    await page.getByRole("link", { name: "Change Disk" }).click();
    await page.getByLabel("Days").fill("30");
    const saveAsking = async (kind: string) => {
      for (const answer of ["Cancel", "Save and delete"]) {
        await save(page);
        const dialog = page.getByRole("dialog", { name: "Delete footage?" });
        await dialog.getByText("12 events with 3.0 GB").waitFor();
        expect(setup.asked).toEqual([]);
        await dialog.getByRole("button", { name: answer }).click();
      }
      await page.getByText(`The ${kind} is saved.`).waitFor();
    };
    await saveAsking("mount");
    expect(setup.asked.splice(0)).toEqual([["mount", { id: 1, revision: 1, limitDays: 30, confirm: true }]]);
    await page.goto(`${client.address}#settings=cameras&open=2`);
    await page.getByLabel("Days kept").fill("3");
    await saveAsking("camera");
    expect(setup.asked).toEqual([["camera", { id: 2, revision: 1, limitDays: 3, confirm: true }]]);
  }, 20_000);
});
