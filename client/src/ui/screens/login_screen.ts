// SPDX-License-Identifier: Apache-2.0
//
// The log-in screen. While the server is away it goes on trying, until it is answered or something else is typed.

import { keepTrying } from "../../wire/keep_trying";
import { isTemporary } from "../../wire/outage";
import { asServerError, ServerError, type Account, type Server } from "../../wire/server";
import { element } from "../widgets/dom";
import { icon } from "../widgets/icons";

/** `hint` says why the user is here again, if there is a reason. The screen is busy until `onLogin` resolves. */
export function loginScreen(server: Server, hint: string, onLogin: (account: Account) => Promise<void>): HTMLElement {
  const account = credentialField("account", "Account", {
    type: "text",
    autocomplete: "username",
    autocapitalize: "none",
    spellcheck: "false",
  });
  const password = credentialField("password", "Password", { type: "password", autocomplete: "current-password" });
  const submit = element("button", { type: "submit", class: "button primary" }, "Log in");
  const message = element("p", { class: "login-message", role: "alert" }, hint);
  const form = element(
    "form",
    { class: "login-form", method: "post" },
    brand(),
    account.row,
    password.row,
    message,
    submit,
  );

  form.addEventListener("submit", (event) => {
    event.preventDefault();
    if (submit.getAttribute("aria-busy") === "true") return;
    const empty = [account, password].find((one) => one.input.value === "");
    if (empty) {
      message.textContent = `Please enter your ${empty === account ? "account" : "password"}.`;
      return empty.input.focus();
    }
    void logIn(account.input.value, password.input.value).finally(() => submit.removeAttribute("aria-busy"));
  });

  async function logIn(accountName: string, passwordText: string): Promise<void> {
    const attempt = new AbortController();
    form.addEventListener("input", () => attempt.abort(), { once: true });
    const showMessage = (sentence: string) => void (message.textContent = sentence);
    showMessage("");
    submit.setAttribute("aria-busy", "true");
    const ask = () =>
      server.login(accountName, passwordText, attempt.signal).catch((error: unknown) => {
        if (isTemporary(asServerError(error))) throw error;
        return asServerError(error);
      });
    const answer = await keepTrying(ask, showMessage, attempt.signal);
    if (!answer) return showMessage("");
    if (!(answer instanceof ServerError)) return onLogin(answer);
    showMessage(answer.message);
    password.input.select();
  }
  return element("main", { class: "login" }, form);
}

export function brand(): HTMLElement {
  return element("div", { class: "brand" }, icon("lighthouse"), element("h1", {}, "Lookhaven"));
}

/** A field with its label, as all have that can be seen without a session. */
export function credentialField(name: string, label: string, attributes: Record<string, string>) {
  const input = element("input", { class: "input", id: name, name, ...attributes });
  return { input, row: element("label", { class: "field", for: name }, element("span", {}, label), input) };
}
