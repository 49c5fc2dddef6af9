// SPDX-License-Identifier: Apache-2.0
//
// A dialog with a form that is tried until it succeeds or the user gives up: what was typed stays where the server
// refuses.

import { asServerError } from "../../wire/server";
import { iconButton } from "./button";
import { element } from "./dom";
import { secretField } from "./fields";

export interface DialogForm {
  title: string;
  content: (Node | string)[];
  /** Empty where there is only something to read. */
  submit: string;
  /**
   * Done when it resolves; what it rejects with is shown in the dialog. A sentence that it returns is shown as well.
   */
  attempt(): Promise<string | void>;
}

/**
 * `host` is what the dialog goes away with. Resolves with whether the attempt succeeded, once the dialog is closed;
 * never where it went away.
 */
export function openDialog(host: HTMLElement, { title, content, submit, attempt }: DialogForm): Promise<boolean> {
  const message = element("p", { class: "form-message", role: "alert" });
  const done = element("button", { type: "submit", class: "button primary" }, submit);
  done.hidden = submit === "";
  const cancel = element("button", { type: "button", class: "button" }, submit ? "Cancel" : "Close");
  const form = element(
    "form",
    { class: "form-dialog-form", method: "dialog" },
    ...content,
    message,
    element("div", { class: "form-buttons" }, done, cancel),
  );
  const dialog = element("dialog", { class: "card dialog form-dialog", "aria-label": title });
  const close = iconButton("close", "Close", () => dialog.close(), "Esc");
  const gap = element("span", { class: "bar-gap" });
  const head = element("header", { class: "dialog-head" }, element("h2", {}, title), gap, close);
  dialog.append(head, form);
  cancel.addEventListener("click", () => dialog.close());
  return new Promise((resolve) => {
    let succeeded = false;
    const finish = (value: boolean) => {
      succeeded = value;
      dialog.close();
    };
    dialog.addEventListener("close", () => {
      dialog.remove();
      resolve(succeeded);
    });
    form.addEventListener("submit", (event) => {
      event.preventDefault();
      if (done.getAttribute("aria-busy") === "true") return;
      message.textContent = "";
      done.setAttribute("aria-busy", "true");
      attempt()
        .then(
          (sentence) => (sentence ? (message.textContent = sentence) : finish(true)),
          (error: unknown) => (message.textContent = asServerError(error).message),
        )
        .finally(() => done.removeAttribute("aria-busy"));
    });
    host.append(dialog);
    dialog.showModal();
    (dialog.querySelector<HTMLElement>("input, select, textarea") ?? cancel).focus();
  });
}

/** Asks users for their password again; `attempt` gets it. */
export function openReauthDialog(
  host: HTMLElement,
  form: Omit<DialogForm, "attempt"> & { attempt(password: string): Promise<string | void> },
): Promise<boolean> {
  const password = secretField("Your own password");
  return openDialog(host, {
    ...form,
    content: [...form.content, password.root],
    attempt: async () => (password.value ? form.attempt(password.value) : "Please enter your password."),
  });
}
