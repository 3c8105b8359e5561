// Signals of the service, for this window.

import { sessionToken } from "./api.js";
import { follow } from "./live-stream.js";

const policy = globalThis.trustedTypes?.createPolicy("marrowdale", {
  createScriptURL: (address) => {
    if (address !== "/assets/live-worker.js") {
      throw new TypeError("no script of ours");
    }
    return address;
  },
}) ?? { createScriptURL: (address) => address };

// Calls `tell` as live-stream.js does.
export function listen(tell) {
  if (typeof SharedWorker === "undefined") {
    follow(sessionToken(), tell);
    return;
  }
  // A new session has a worker of its own.
  const worker = new SharedWorker(policy.createScriptURL("/assets/live-worker.js"),
                                  { type: "module", name: sessionToken().slice(0, 8) });
  worker.onerror = () => follow(sessionToken(), tell);
  worker.port.onmessage = ({ data }) => tell(data);
  worker.port.start();
  const join = () => worker.port.postMessage({ token: sessionToken() });
  join();
  addEventListener("pagehide", () => worker.port.postMessage({ bye: true }));
  addEventListener("pageshow", ({ persisted }) => {
    if (persisted) {
      join();
      tell({ state: "connected" });
    }
  });
}
