// SPDX-License-Identifier: Apache-2.0
//
// What stands in place of the log-in while there is no account: with a one-time address the form that makes the first
// one, else how to get such an address.

import { asServerError, type Account, type Server } from "../../wire/server";
import { accountNameProblem, passwordProblem } from "../widgets/credentials";
import { element } from "../widgets/dom";
import { brand, credentialField } from "./login_screen";

/** What the screen does next. */
export interface SetupOutcome {
  made: (account: Account) => Promise<void>;
  /** There is an account already, as the sentence says. */
  hasAccount: (sentence: string) => void;
}

/** `token` is asked for each attempt: when the address has expired, a newer one can be opened over what was typed. */
export function setupScreen(server: Server, token: () => string | null, outcome: SetupOutcome): HTMLElement {
  const plain = { type: "text", autocomplete: "username", autocapitalize: "none", spellcheck: "false" };
  const secret = { type: "password", autocomplete: "new-password", maxlength: "1024" };
  const name = credentialField("account", "Account", plain);
  const password = credentialField("password", "Password (at least eight characters)", secret);
  const again = credentialField("password-again", "Repeat password", secret);
  const submit = element("button", { type: "submit", class: "button primary" }, "Create the account");
  const message = element("p", { class: "login-message", role: "alert" });
  const form = element(
    "form",
    { class: "setup-form", method: "post", novalidate: true },
    brand(),
    element("h2", {}, "Set up Lookhaven"),
    text("First an account of your own, which may do everything; then a camera, and where to record it."),
    name.row,
    password.row,
    again.row,
    message,
    submit,
  );

  const problem = (): readonly [sentence: string, at: HTMLInputElement] | null => {
    if (!name.input.value) return ["Please choose a name for the account.", name.input];
    const ofName = accountNameProblem(name.input.value);
    if (ofName) return [ofName, name.input];
    const sentence = passwordProblem(password.input.value, again.input.value);
    return sentence ? [sentence, password.input] : null;
  };
  const make = async () => {
    try {
      await outcome.made(await server.makeFirstAccount(name.input.value, password.input.value, token() ?? ""));
    } catch (error) {
      const failure = asServerError(error);
      if (failure.status === 409) return outcome.hasAccount(failure.message);
      const isExpired = failure.status === 403;
      message.textContent = isExpired ? `${failure.message} Open it in this tab: what you have typed stays.` : failure.message;
    }
  };
  form.addEventListener("submit", (event) => {
    event.preventDefault();
    if (submit.getAttribute("aria-busy") === "true") return;
    const [sentence, at] = problem() ?? ["", null];
    message.textContent = sentence;
    if (at) return at.focus();
    submit.setAttribute("aria-busy", "true");
    void make().finally(() => submit.removeAttribute("aria-busy"));
  });
  return element("main", { class: "login" }, form);
}

/** Tells everybody the same. `askAgain` looks whether there is an account now, and shows what can be done then. */
export function noAccountScreen(askAgain: () => Promise<void>): HTMLElement {
  const again = element("button", { type: "button", class: "button" }, "Check again");
  const message = element("p", { class: "login-message", role: "status" });
  again.addEventListener("click", () => {
    message.textContent = "";
    void askAgain().then(() => (message.textContent = "There is still no account."));
  });
  const body = element(
    "div",
    { class: "setup-form no-account" },
    brand(),
    element("h2", {}, "No account exists yet"),
    text("On the server, as root or as the user who runs Lookhaven, this command prints an address:"),
    element("pre", { class: "setup-command" }, "lookhaven setup-address"),
    text("Open that address in a browser within 15 minutes to make the first account."),
    again,
    message,
  );
  return element("main", { class: "login" }, body);
}

function text(sentence: string): HTMLElement {
  return element("p", { class: "setup-text" }, sentence);
}
