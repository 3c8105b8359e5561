// Signals of the service, for this window.

import { sessionEnded, sessionToken } from "./api.js";
import { follow } from "./live-stream.js";

const policy = globalThis.trustedTypes?.createPolicy("marrowdale", {
  createScriptURL: (address) => {
    if (address !== "/assets/live-worker.js") {
      throw new TypeError("no script of ours");
    }
    return address;
  },
}) ?? { createScriptURL: (address) => address };

// Calls `tell` as live-stream.js does, for as long as the session is this window's; that it ended is
// told to api.js.
export function listen(tell) {
  const token = sessionToken();
  const hear = (message) => {
    if (message.state === "ended") {
      sessionEnded(token);
    } else if (token === sessionToken()) {
      tell(message);
    }
  };
  if (typeof SharedWorker === "undefined") {
    follow(token, hear);
    return;
  }
  // A new session has a worker of its own.
  const worker = new SharedWorker(policy.createScriptURL("/assets/live-worker.js"),
                                  { type: "module", name: token.slice(0, 8) });
  worker.onerror = () => follow(token, hear);
  worker.port.onmessage = ({ data }) => hear(data);
  worker.port.start();
  const join = () => worker.port.postMessage({ token });
  join();
  addEventListener("pagehide", () => worker.port.postMessage({ bye: true }));
  addEventListener("pageshow", ({ persisted }) => {
    if (persisted) {
      join();
      hear({ state: "connected" });
    }
  });
}
