// SPDX-License-Identifier: Apache-2.0
//
// Devices, and the page System, in a real browser.

import type { Page } from "playwright-core";
import { cameraRecord } from "../../support/fake_setup";
import { hasBrowser, ServedClient } from "../../support/served_client";

describe.skipIf(!hasBrowser)("in a browser", () => {
  const client = new ServedClient();
  const { setup } = client.server;

  beforeEach(() => {
    client.server.hasSession = client.server.isManager = true;
    client.server.isAway = false;
    setup.asked.length = 0;
    setup.camera.splice(0, Infinity, cameraRecord(1, "Entrance"), cameraRecord(2, "Gate"));
  });

  const open = (section: string) => client.open(`${client.address}#settings=${section}`, 1024, 768);
  const save = (page: Page) => page.getByRole("button", { name: "Save", exact: true }).click();

  test("a device is added with its ports, and no change of someone else's is lost unseen", async () => {
    setup.device.splice(0, Infinity);
    const page = await open("devices");
    await page.getByRole("button", { name: "Add the first device…" }).click();
    const dialog = page.locator("dialog[open]");
    const add = dialog.getByRole("button", { name: "Add", exact: true });
    await add.click();
    await dialog.getByText("give the device a name").waitFor();
    await dialog.getByLabel("Name").fill("Plant room");
    await dialog.getByText("I/O module").click();
    for (let port = 0; port < 3; port += 1) await dialog.getByRole("button", { name: "Add a port" }).click();
    await dialog.getByRole("button", { name: "Remove this port" }).nth(1).click();
    await dialog.getByLabel("Number").last().fill("0");
    await add.click();
    await dialog.getByText("Two ports have the same number").waitFor();
    await dialog.getByLabel("Number").last().fill("5");
    await dialog.getByLabel("Type").last().selectOption("output");
    await dialog.getByLabel("Camera", { exact: true }).first().selectOption("Gate");
    await add.click();
    await dialog.waitFor({ state: "detached" });
    const port = [{ port: 0, type: "in" as const, camera: 2 }, { port: 5, type: "out" as const, camera: 0 }];
    expect(setup.asked).toEqual([["Device.Add", { kind: "io", name: "Plant room", camera: 0, port }]]);

    const device = { kind: "door" as const, id: 1, revision: 2, name: "Front door", server: 0, camera: 9, port: [] };
    setup.device.push(device);
    await page.reload();
    await page.getByRole("button", { name: "Change Front door" }).click();
    device.revision = 3;
    await dialog.getByLabel("Name").fill("Main door");
    const saveIt = dialog.getByRole("button", { name: "Save" });
    await saveIt.click();
    await dialog.getByText("Someone else has changed Front door").waitFor();
    await saveIt.click();
    await page.getByText("Main door", { exact: true }).waitFor();
    expect(setup.device[0]).toMatchObject({ name: "Main door", camera: 9, revision: 4 });
  }, 30_000);

  test("what is wrong is shown with a command to copy; settings are saved one by one, and nobody's change is lost", async () => {
    const number = { kind: "number" as const, min: 1, max: 16, operator: false, revision: 1, meaning: "recordings side by side" };
    setup.setting.splice(0, Infinity,
      { ...number, name: "players_per_session", value: 4, initial: 4 },
      { ...number, name: "cms", kind: "switch", value: false, initial: false, min: null, max: null },
      { ...number, name: "mount_folders", kind: "folders", value: "/mnt", initial: "/mnt", min: null, max: null, operator: true });
    const folder = { name: "folder", ok: true, finding: [], unchecked: null };
    const severity = "fault" as const;
    const mounts = { name: "mounts", ok: false, finding: [{ problem: "there is no mount", remedy: "lookhaven init", severity }], unchecked: null };
    const certificate = { subject: "CN=nvr", name: ["nvr"], fingerprint: "AB:CD", end: 1_790_000_000, selfSigned: true };
    const recorder = { name: "recorder", state: "running" as const, since: 1_790_000_000, replaced: false };
    setup.status = { version: "1.2.3", store: { engine: "sqlite", schema: 7 }, process: [recorder], certificate, check: [folder, mounts] };
    const page = await open("system");
    await page.getByText("1 problem", { exact: true }).waitFor();
    await page.getByRole("button", { name: "Copy lookhaven init" }).click();
    await page.getByText(/Copied|Selected/).waitFor();
    for (const text of ["1.2.3", "SQLite, schema 7", "AB:CD", "CN=nvr", "OK: folder."]) await page.getByText(text).waitFor();
    client.server.isAway = true;
    await page.getByRole("button", { name: "Check again" }).click();
    await page.getByRole("alert").getByText("does not answer").first().waitFor();
    client.server.isAway = false;
    setup.status.check = [folder];
    await page.getByRole("button", { name: "Try again" }).first().click();
    await page.getByText("All is well.").waitFor();
    const side = page.getByLabel("Recordings side by side");
    for (const [typed, told] of [["17", "from 1 to 16"], ["2.5", "whole number"], ["9", "The settings are saved."]] as const) {
      await side.fill(typed);
      await save(page);
      await page.getByText(told).last().waitFor();
    }
    expect(setup.asked).toEqual([["SetSetting", { name: "players_per_session", value: 9, revision: 1 }]]);
    Object.assign(setup.setting[0]!, { value: 5, revision: 7 });
    await side.fill("8");
    await page.getByLabel("Central management").check();
    await save(page);
    const rows = page.locator(".form-conflict tbody tr");
    await rows.first().waitFor();
    expect(await rows.allInnerTexts()).toEqual(["Recordings side by side\t8\t5", "Central management\tyes\tno"]);
    await page.getByRole("button", { name: "Overwrite with mine" }).click();
    await vi.waitFor(() => expect(setup.setting.map(({ value }) => value)).toEqual([8, true, "/mnt"]));
    await side.fill("3");
    await page.getByRole("button", { name: "Cancel" }).click();
    await vi.waitFor(async () => expect(await side.inputValue()).toBe("8"));
  }, 30_000);

  test("the last errors are shown, more on demand; where there are none, the page says why, and where to look", async () => {
    const store = { engine: "sqlite", schema: 7 };
    setup.status = { version: "1.2.3", store, process: [], certificate: null, check: [] };
    const entry = Array.from({ length: 12 }, (_, at) => ({ time: 1_790_000_000 - at, process: "recorder", text: `Gate <b>${at}</b> fails` }));
    setup.tail = { entry, files: true, journal: false };
    const page = await open("system");
    const panel = page.locator(".form-part", { hasText: "Last errors" }).last();
    await panel.getByText("Gate <b>9</b> fails").waitFor();
    expect(await panel.locator("tbody tr").count()).toBe(10);
    await panel.getByRole("button", { name: "Show up to 200" }).click();
    await panel.getByText("Gate <b>11</b> fails").waitFor();
    expect(await panel.getByRole("button", { name: "Show up to 200" }).count()).toBe(0);
    const again = () => page.getByRole("button", { name: "Check again" }).click();
    for (const [files, journal, told] of [[true, false, "No errors in the log files"], [false, false, "has no log files"], [false, true, "journal of the system"]] as const) {
      setup.tail = { entry: [], files, journal };
      await again();
      await panel.getByText(told).waitFor();
    }
    expect(await panel.getByText("No errors").count() + (await panel.getByText("no log files").count())).toBe(0);
    await panel.getByRole("button", { name: /^Copy journalctl/ }).waitFor();
    client.server.isAway = true;
    await again();
    await panel.getByRole("alert").waitFor();
    client.server.isAway = false;
    await panel.getByRole("button", { name: "Try again" }).click();
    await panel.getByText("journal of the system").waitFor();
    setup.tail = { entry: [], files: true, journal: false };
  }, 30_000);

  test("a certificate is replaced once its files are checked and its price is told; log levels are set, nobody's lost", async () => {
    const certificate = { subject: "CN=nvr", name: ["nvr"], fingerprint: "AB:CD", end: 1_790_000_000, selfSigned: true };
    const store = { engine: "sqlite", schema: 7 };
    setup.status = { version: "1.2.3", store, process: [], certificate, check: [] };
    setup.log.category = [{ name: "liveview", level: "error" }, { name: "100", level: "off" }];
    setup.offered = null;
    const page = await open("system");
    const dialog = page.locator("dialog[open]");
    await page.getByRole("button", { name: "Replace the certificate…" }).click();
    const check = dialog.getByRole("button", { name: "Check" });
    await check.click();
    await dialog.getByText("choose both files").waitFor();
    const file = (name: string, bytes: number) => ({ name, mimeType: "application/x-pem-file", buffer: Buffer.alloc(bytes, "x") });
    await dialog.getByLabel("Certificate").setInputFiles(file("own.pem", 40_000));
    await dialog.getByLabel("Private key").setInputFiles(file("own.key", 4));
    await check.click();
    await dialog.getByText("too large").waitFor();
    await dialog.getByLabel("Certificate").setInputFiles(file("own.pem", 8));
    await check.click();
    await dialog.getByText("that of another certificate").waitFor();
    setup.offered = { ...certificate, fingerprint: "EF:01", selfSigned: false, pairedHosts: ["Watcher"] };
    await check.click();
    await dialog.getByText("1 host is paired by the certificate from before and must be paired again: Watcher.").waitFor();
    await dialog.getByText("EF:01").waitFor();
    for (const [typed, told] of [["wrong", "your own password is wrong"], ["right", "The certificate is replaced."]] as const) {
      await dialog.getByLabel("Your own password").fill(typed);
      await dialog.getByRole("button", { name: "Replace", exact: true }).click();
      await page.getByText(told).waitFor();
    }
    expect(setup.asked).toEqual([["SetCertificate", { certificate: "xxxxxxxx", key: "xxxx", confirm: true, reauth: "right" }]]);
    await page.getByText("EF:01").waitFor();

    await page.getByRole("button", { name: "Change log levels…" }).click();
    setup.log = { ...setup.log, revision: 9 };
    await dialog.getByLabel("Live view").selectOption("debug");
    const saveIt = dialog.getByRole("button", { name: "Save" });
    await saveIt.click();
    await dialog.getByText("Someone else has changed the log levels").waitFor();
    await saveIt.click();
    await page.getByText("The log levels are saved.").waitFor();
    expect(setup.asked[1]).toEqual(["SetLogLevels", { revision: 9, category: [{ name: "liveview", level: "debug" }] }]);
    expect(setup.log.category).toEqual([{ name: "liveview", level: "debug" }, { name: "100", level: "off" }]);
    await page.getByText("Category 100").waitFor();
  }, 30_000);
});
