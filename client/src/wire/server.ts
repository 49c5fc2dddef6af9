// SPDX-License-Identifier: Apache-2.0
//
// The web API as the client uses it: typed answers, and for each failure one sentence for the user.

import { Alerts } from "./alerts";
import { kVideoTypeMjpeg, type Camera, type CameraList, type Snapshot, type StillCamera } from "./camera";
import { Deadline } from "./deadline";
import { sentenceOf } from "./sentence";
import { SignalLosses, type CameraStates } from "./signal_losses";
import { postFile, type UploadOptions } from "./upload";

export interface Account {
  account: string;
  user_id: number;
  is_manager: boolean;
  /** How many recordings one session may play side by side; 1 where the server does not say. */
  players_per_session?: number;
}

const kAnswerTimeoutMs = 20_000;
/** Once the last byte of a file has gone, the server may work on it. */
const kUploadTimeoutMs = 40_000;
/** What the web server answers where it cannot reach the web API. */
const kUnreachableMessage = "the web API does not answer";
const kTooManyAttempts = "Too many attempts. Please wait a minute.";

/** A request that failed; `message` is for the user. */
export class ServerError extends Error {
  /** `status` is the HTTP status, 0 when no answer came; `code` is the API's own number, 0 without one. */
  constructor(
    readonly status: number,
    readonly code: number,
    message: string,
    /** What the answer tells beside the sentence: the record as it is now where a change came too late (409). */
    readonly data: unknown = null,
  ) {
    super(message);
  }
}

interface CallOptions {
  form?: Record<string, string>;
  json?: unknown;
  quiet?: boolean;
  signal?: AbortSignal | undefined;
  timeoutMs?: number;
  keepalive?: boolean;
}

interface Failure {
  error?: { code?: number; message?: string; data?: unknown };
}

/** `noAnswer`: what to say for a 502 of the host itself, whose handler has given no answer. */
function sentenceFor(status: number, serverMessage?: string, noAnswer?: string): string {
  switch (status) {
    case 0:
      return "The server does not answer.";
    case 401:
      return "You are not logged in.";
    case 429:
      return serverMessage ? sentenceOf(serverMessage) : kTooManyAttempts;
    case 502:
      if (serverMessage === kUnreachableMessage) return sentenceFor(0);
      return noAnswer ?? "The server could not answer (502).";
    case 503:
      return serverMessage ? sentenceOf(serverMessage) : "The server is busy.";
    case 504:
      return "The camera sends no picture.";
    default:
      if (status >= 500) return `The server could not answer (${status}).`;
      // A whole sentence was written for the user.
      if (serverMessage?.endsWith(".")) return serverMessage;
      return serverMessage ? `The server refused: ${serverMessage}.` : "The server refused.";
  }
}

async function failureOf(answer: Response, noAnswer?: string): Promise<ServerError> {
  let failure: Failure = {};
  try {
    failure = ((await answer.json()) as Failure | null) ?? {};
  } catch {
    // A web server's own error page is not JSON; the status says enough.
  }
  const { code = 0, message, data } = failure.error ?? {};
  return new ServerError(answer.status, code, sentenceFor(answer.status, message, noAnswer), data ?? null);
}

export class Server {
  /** As of now, while they are watched. */
  readonly alerts = new Alerts();
  /** As of the last refresh. */
  readonly signalLosses = new SignalLosses(() =>
    this.call<CameraStates>("VEXO.Catalog", "CameraStates", {}, { quiet: true }),
  );
  readonly #onSessionEnd: () => void;

  /** `onSessionEnd` is called whenever an answer says that there is no session (any more). */
  constructor(onSessionEnd: () => void) {
    this.#onSessionEnd = onSessionEnd;
  }

  /** The account of the running session; without one, whether anybody could log in at all. */
  async status(): Promise<Account | "logged-out" | "no-account"> {
    try {
      return await this.call<Account>("VEXO.Auth", "Status", {}, { quiet: true });
    } catch (error) {
      const { status, data } = asServerError(error);
      if (status !== 401) throw error;
      return (data as { noAccount?: boolean } | null)?.noAccount ? "no-account" : "logged-out";
    }
  }

  /** Makes the first account, an owner's, and logs in. `token` is that of the one-time address. */
  async makeFirstAccount(account: string, password: string, token: string): Promise<Account> {
    const form = { account, password, token };
    return this.call<Account>("VEXO.Auth", "MakeFirstAccount", {}, { form, quiet: true });
  }

  async login(account: string, password: string, signal?: AbortSignal): Promise<Account> {
    try {
      return await this.call<Account>("VEXO.Auth", "Login", {}, { form: { account, password }, quiet: true, signal });
    } catch (error) {
      const { status, code } = asServerError(error);
      if (status === 401) throw new ServerError(status, code, "The account or the password is wrong.");
      if (status === 429) throw new ServerError(status, code, kTooManyAttempts);
      throw error;
    }
  }

  async logout(): Promise<void> {
    await this.call<unknown>("VEXO.Auth", "Logout", {}, { form: {} });
  }

  async cameras(): Promise<CameraList> {
    return this.call<CameraList>("VEXO.Lookhaven.Player", "LoadCamera", {});
  }

  /** One picture in the camera's usual size. */
  async snapshot(camera: StillCamera, owner?: AbortSignal, timeoutMs = kAnswerTimeoutMs): Promise<Snapshot> {
    const deadline = new Deadline(timeoutMs, owner);
    try {
      const answer = await this.#still(camera, deadline);
      const captured = Number(answer.headers.get("X-Capture-Time"));
      return { jpeg: await answer.blob(), takenMs: captured > 0 ? captured * 1000 : Date.now() };
    } catch (error) {
      throw asServerError(error);
    } finally {
      deadline.release();
    }
  }

  // A JPEG camera's picture comes as it is; of other cameras the host makes one.
  #still(camera: StillCamera, deadline: Deadline): Promise<Response> {
    const own = camera.video_type === kVideoTypeMjpeg || camera.server ? playOf(camera, { snapshot: "1" }) : null;
    if (own) return this.media(...own, deadline);
    return this.media("VEXO.Picture", "Get", { camera: String(camera.id) }, deadline);
  }

  /**
   * Opens a live stream; the caller reads its body and ends it with `signal`. `profile` null means the camera's own
   * choice.
   */
  async live(camera: Camera, profile: number | null, signal: AbortSignal): Promise<Response> {
    const more: Record<string, string> = profile === null ? {} : { profileType: String(profile) };
    return this.media(...playOf(camera, more), { signal }).catch((error: unknown) => {
      throw asServerError(error);
    });
  }

  /**
   * An answer that holds pictures, or a file of them; a JSON answer, whatever its status, is a failure. `noAnswer` is
   * what to say where the host's handler has given none, as for a camera that cannot be opened.
   */
  async media(
    api: string,
    method: string,
    parameters: Record<string, string>,
    { signal, noAnswer = "No picture was received." }: { signal: AbortSignal; noAnswer?: string },
  ): Promise<Response> {
    const answer = await fetch(address(api, method, parameters), { signal });
    if (answer.ok && !/json/i.test(answer.headers.get("Content-Type") ?? "")) return answer;
    if (answer.status === 401) this.#onSessionEnd();
    throw await failureOf(answer, noAnswer);
  }

  /**
   * The data of an answer. With `form` or `json` the request is a POST. Unless `quiet`, an ended session is reported.
   * `signal` ends the request. With `keepalive` it continues when the page is left.
   */
  async call<Data>(
    api: string,
    method: string,
    parameters: Record<string, string>,
    how: CallOptions = {},
  ): Promise<Data> {
    const deadline = new Deadline(how.timeoutMs ?? kAnswerTimeoutMs, how.signal);
    try {
      const answer = await fetch(address(api, method, parameters), {
        signal: deadline.signal,
        keepalive: how.keepalive ?? false,
        ...(how.form ? { method: "POST", body: new URLSearchParams(how.form) } : {}),
        ...(how.json
          ? { method: "POST", body: JSON.stringify(how.json), headers: { "Content-Type": "application/json" } }
          : {}),
      });
      return await this.#dataOf<Data>(answer, how.quiet ?? false);
    } catch (error) {
      throw asServerError(error);
    } finally {
      deadline.release();
    }
  }

  /** The data of an answer to a POST whose body is the file. */
  async upload<Data>(
    api: string,
    method: string,
    parameters: Record<string, string>,
    file: Blob,
    { signal, onProgress }: UploadOptions,
  ): Promise<Data> {
    const deadline = new Deadline(kUploadTimeoutMs, signal);
    const noteProgress = (fraction: number) => {
      deadline.extend();
      onProgress(fraction);
    };
    try {
      const options = { signal: deadline.signal, onProgress: noteProgress };
      return await this.#dataOf<Data>(await postFile(address(api, method, parameters), file, options), false);
    } catch (error) {
      throw asServerError(error);
    } finally {
      deadline.release();
    }
  }

  async #dataOf<Data>(answer: Response, isQuiet: boolean): Promise<Data> {
    if (answer.status === 401 && !isQuiet) this.#onSessionEnd();
    if (!answer.ok) throw await failureOf(answer);
    const envelope = (await answer.clone().json()) as { success?: boolean; data?: Data };
    if (envelope.success !== true) throw await failureOf(answer);
    return envelope.data as Data;
  }
}

/** How a camera's live view is asked for: this host fetches the live views of paired hosts' cameras for us. */
function playOf({ id, server }: StillCamera, more: Record<string, string>): [string, string, Record<string, string>] {
  const camera = String(id);
  if (server) return ["VEXO.Relay", "Play", { server: String(server), camera, ...more }];
  return ["VEXO.Lookhaven.Player.LiveviewSrc", "Play", { camera, ...more }];
}

/** Relative, so that the client works below any path. */
export function address(api: string, method: string, parameters: Record<string, string>): string {
  return `webapi?${new URLSearchParams({ api, version: "1", method, ...parameters })}`;
}

export function asServerError(error: unknown): ServerError {
  if (error instanceof ServerError) return error;
  // fetch reports a lost connection as TypeError and our deadline as AbortError; invalid JSON is a SyntaxError.
  if (error instanceof SyntaxError) return new ServerError(502, 0, "The server's answer is not valid.");
  return new ServerError(0, 0, sentenceFor(0));
}
