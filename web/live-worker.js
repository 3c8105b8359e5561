// Shared by all windows of a web browser, so that they need one connection together.

import { follow } from "/assets/live-stream.js";

const ports = new Set();
let state = null;
let isFollowing = false;

function tell(message) {
  if (message.state) {
    state = message;
  }
  for (const port of ports) {
    port.postMessage(message);
  }
}

self.onconnect = ({ ports: [port] }) => {
  port.onmessage = ({ data }) => {
    if (data.bye) {
      ports.delete(port);
      return;
    }
    ports.add(port);
    if (state) {
      port.postMessage(state);
    }
    if (!isFollowing) {
      isFollowing = true;
      follow(data.token, tell).finally(() => { isFollowing = false; });
    }
  };
};
