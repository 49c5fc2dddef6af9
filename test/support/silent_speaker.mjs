// SPDX-License-Identifier: Apache-2.0
//
// A sound device for machines that have none: Firefox plays to no page without one. What it plays, nobody hears.
import { spawn } from "node:child_process";
import { existsSync, mkdtempSync, rmSync } from "node:fs";
import { tmpdir } from "node:os";
import { join } from "node:path";
import { setTimeout as wait } from "node:timers/promises";

const kStartMs = 10_000;

/** Starts it, until `stop` is called or this process ends. The variables are those by which a program finds it. */
export async function startSilentSpeaker() {
  const folder = mkdtempSync(join(tmpdir(), "speaker-"));
  const socket = join(folder, "socket");
  const modules = ["module-null-sink", `module-native-protocol-unix auth-anonymous=1 socket=${socket}`];
  const options = ["-n", "--daemonize=no", "--use-pid-file=no", "--exit-idle-time=-1", ...modules.flatMap((module) => ["-L", module])];
  // Also when this process is killed.
  const server = spawn("setpriv", ["--pdeathsig", "TERM", "pulseaudio", ...options], {
    env: { ...process.env, PULSE_RUNTIME_PATH: folder, PULSE_STATE_PATH: folder },
    stdio: "ignore",
  });
  server.unref();
  const stop = () => {
    server.kill();
    rmSync(folder, { recursive: true, force: true });
  };
  process.once("exit", stop);
  for (const end = Date.now() + kStartMs; !existsSync(socket); await wait(20)) {
    if (server.exitCode !== null || Date.now() > end) throw new Error("pulseaudio does not start; script/bootstrap --test installs it");
  }
  return { variables: { PULSE_SERVER: `unix:${socket}` }, stop };
}
