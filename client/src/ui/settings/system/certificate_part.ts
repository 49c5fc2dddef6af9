// SPDX-License-Identifier: Apache-2.0
//
// The server's certificate: what browsers compare it by, until when it is valid, and how to replace it.

import type { Certificate } from "../../../wire/system";
import { button } from "../../widgets/button";
import { element } from "../../widgets/dom";
import { factList } from "../../widgets/fact_list";
import { formPart } from "../../widgets/fields";
import { calendarDate } from "../../widgets/text";
import { copyable } from "./copyable";

/** `certificate` is null where the server has none of its own that can be read. */
export function certificatePart(certificate: Certificate | null, replace: () => void): HTMLElement {
  const buttons = element("div", { class: "form-buttons" }, button("Replace the certificate…", replace));
  return formPart("Certificate", ...certificateContent(certificate), buttons);
}

function certificateContent(certificate: Certificate | null): HTMLElement[] {
  if (!certificate) return [element("p", { class: "quiet" }, "The server has no certificate of its own that can be read.")];
  const { subject, name, fingerprint, end, selfSigned } = certificate;
  const hint = "Browsers ask once about a certificate that is self-signed, and show this fingerprint.";
  return [
    factList([
      ["Subject", subject],
      ["Names", name.join(", ") || "none"],
      ["Expires", calendarDate(end * 1000)],
      ["Signed by", selfSigned ? "itself" : "an authority"],
    ]),
    element("p", { class: "quiet" }, "Fingerprint (SHA-256)"),
    copyable(fingerprint),
    ...(selfSigned ? [element("p", { class: "form-hint" }, hint)] : []),
  ];
}
