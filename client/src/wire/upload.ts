// SPDX-License-Identifier: Apache-2.0
//
// A request whose body is a file.
//
// Why so        fetch does not tell how much of a body has gone.

export interface UploadOptions {
  /** Ends the request. */
  signal: AbortSignal;
  /** From 0 to 1, as bytes leave the browser. */
  onProgress(fraction: number): void;
}

/** Rejects with a TypeError where no answer came, as fetch does. */
export function postFile(address: string, file: Blob, { signal, onProgress }: UploadOptions): Promise<Response> {
  return new Promise((resolve, reject) => {
    const request = new XMLHttpRequest();
    const fail = () => reject(new TypeError("no answer"));
    request.open("POST", address);
    request.setRequestHeader("Content-Type", file.type || "application/octet-stream");
    request.upload.addEventListener("progress", ({ loaded, total }) => onProgress(total > 0 ? loaded / total : 0));
    request.addEventListener("load", () => resolve(new Response(request.responseText, { status: request.status })));
    request.addEventListener("error", fail);
    request.addEventListener("abort", fail);
    signal.addEventListener("abort", () => request.abort());
    if (signal.aborted) return fail();
    request.send(file);
  });
}
