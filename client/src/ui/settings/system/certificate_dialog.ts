// SPDX-License-Identifier: Apache-2.0
//
// Replaces the server's certificate: two files, what the server says of them, and the user's own password.

import type { OfferedCertificate, System } from "../../../wire/system";
import { element } from "../../widgets/dom";
import { fileField } from "../../widgets/fields";
import { openDialog, openReauthDialog } from "../../widgets/form_dialog";
import { notify } from "../../widgets/notice";
import { calendarDate } from "../../widgets/text";

/** As the server has them. */
const kMaxChainBytes = 32_768;
const kMaxKeyBytes = 8_192;

/** Resolves with whether it is replaced. */
export async function askForCertificate(host: HTMLElement, system: System): Promise<boolean> {
  const chain = fileField("Certificate", ".pem,.crt,.cer", "PEM: the server's own certificate first, then those of its issuers.");
  const key = fileField("Private key", ".pem,.key", "PEM, without a password. It is stored on the server and never shown.");
  let offer = { certificate: "", key: "" };
  let told: OfferedCertificate | null = null;
  const isChecked = await openDialog(host, {
    title: "Replace the certificate",
    content: [chain.root, key.root],
    submit: "Check",
    attempt: async () => {
      if (!chain.file || !key.file) return "Please choose both files.";
      if (chain.file.size > kMaxChainBytes) return "The file of the certificate is too large to be one.";
      if (key.file.size > kMaxKeyBytes) return "The file of the key is too large to be one.";
      offer = { certificate: await chain.file.text(), key: await key.file.text() };
      told = await system.checkCertificate(offer);
    },
  });
  if (!isChecked || !told) return false;
  const isDone = await openReauthDialog(host, {
    title: "Replace the certificate?",
    content: sentences(told).map((sentence) => element("p", {}, sentence)),
    submit: "Replace",
    attempt: async (reauth) => {
      const { reloaded } = await system.setCertificate(offer, reauth);
      notify(reloaded ? "The certificate is replaced." : "The certificate is replaced. It is shown once the web server starts.");
    },
  });
  offer = { certificate: "", key: "" };
  return isDone;
}

/** What is to be known before. */
export function sentences({ subject, name, end, fingerprint, selfSigned, pairedHosts }: OfferedCertificate): string[] {
  const hosts = pairedHosts.join(", ");
  const many = pairedHosts.length === 1 ? "1 host is" : `${pairedHosts.length} hosts are`;
  return [
    `${subject}, for ${name.join(", ") || "no name that browsers look at"}, until ${calendarDate(end * 1000)}.`,
    `Fingerprint (SHA-256): ${fingerprint}`,
    selfSigned ? "It is self-signed: browsers will ask about it once." : "A browser that does not know its issuer will ask about it.",
    ...(hosts ? [`${many} paired by the certificate from before and must be paired again: ${hosts}.`] : []),
  ];
}
