// Requests to the service, with the session's token in a header.

import { t } from "./text.js";

export const ROOT = "VantrelRootContainerItemIdentifier";
export const WORKING_SET = "VantrelWorkingSetContainerItemIdentifier";

export const CAN = { read: 1, write: 2, move: 4, rename: 8, trash: 16, remove: 32 };

const STORED = "marrowdale-session";

// An error as the service tells it: `name` is what to decide by.
export class ServiceError extends Error {
  constructor(status, error = {}) {
    super(error.message ?? t("errorUnknown"));
    this.status = status;
    this.name = error.name ?? "other";
    this.details = error;
  }
}

// The service can't be reached.
export class ConnectionError extends Error {}

let session = null;
let onEnded = () => {};

export function sessionToken() {
  return session;
}

export function whenSessionEnds(callback) {
  onEnded = callback;
}

// That session is good no more, which matters where it is still this window's.
export function sessionEnded(token) {
  if (token === session) {
    onEnded();
  }
}

// Takes up the session of this web browser, or begins one with the launch token that the printed
// address carries. False when there is none.
export async function begin() {
  const launch = /^#launch=([0-9a-f]+)$/.exec(location.hash)?.[1];
  session = localStorage.getItem(STORED);
  if (launch) {
    history.replaceState(null, "", "/#/");
    const answer = await fetch("/v1/sessions", {
      method: "POST", headers: { "Content-Type": "application/json" },
      body: JSON.stringify({ launch }) });
    if (answer.ok) {
      session = (await answer.json()).session;
      localStorage.setItem(STORED, session);
    }
  }
  return session !== null && isGood();
}

// Takes up the session that another window of this web browser has begun.
export async function takeUp() {
  const other = localStorage.getItem(STORED);
  if (other === null || other === session) {
    return false;
  }
  session = other;
  return isGood();
}

// Calls back whenever another window begins a session.
export function whenSessionBegins(callback) {
  addEventListener("storage", ({ key }) => {
    if (key === STORED) {
      callback();
    }
  });
}

async function isGood() {
  const answer = await fetch("/v1/service", { headers: headers() });
  return answer.status !== 401;
}

// Whether the service itself answers, however long the documents take.
export async function isAnswering(milliseconds) {
  try {
    return (await fetch("/v1/service", { headers: headers(),
                                         signal: AbortSignal.timeout(milliseconds) })).ok;
  } catch {
    return false;
  }
}

export function headers(more = {}) {
  return { "Marrowdale-Session": session ?? "", ...more };
}

async function send(path, options = {}) {
  const token = session;
  let answer;
  try {
    answer = await fetch(path, { ...options, headers: headers(options.headers) });
  } catch (error) {
    if (error.name === "AbortError") {
      throw error;
    }
    throw new ConnectionError(t("errorConnection"));
  }
  if (answer.status === 401) {
    sessionEnded(token);
  }
  return answer;
}

export async function failureOf(answer) {
  let body = {};
  try {
    body = await answer.json();
  } catch {
    // An answer without words is told by its status.
  }
  return new ServiceError(answer.status, body.error);
}

export async function get(path, options) {
  const answer = await send(path, options);
  if (!answer.ok) {
    throw await failureOf(answer);
  }
  return answer.json();
}

export async function post(path, body) {
  return get(path, { method: "POST", headers: { "Content-Type": "application/json" },
                     body: JSON.stringify(body) });
}

export async function remove(path) {
  return get(path, { method: "DELETE", headers: { "Content-Type": "application/json" } });
}

export function itemPath(identifier, view = "") {
  return `/v1/items/${encodeURIComponent(identifier)}${view}`;
}

export function item(identifier) {
  return get(itemPath(identifier));
}

// The first bytes of a document.
export async function beginning(identifier, length, signal) {
  const answer = await send(itemPath(identifier, "/content"),
                            { headers: { Range: `bytes=0-${length - 1}` }, signal });
  if (answer.status === 416) {
    return new Uint8Array();
  }
  if (!answer.ok) {
    throw await failureOf(answer);
  }
  return new Uint8Array(await answer.arrayBuffer());
}

// A document, or its small picture, as a whole; empty where there is none.
export async function bytesOf(identifier, view) {
  const answer = await send(itemPath(identifier, view));
  if (!answer.ok) {
    throw await failureOf(answer);
  }
  return new Uint8Array(await answer.arrayBuffer());
}

// An address that an image, a frame or a download can be given.
export async function addressOf(identifier, view) {
  return (await post("/v1/addresses", { item: identifier, view })).address;
}

export async function archiveOf(identifiers, name) {
  return (await post("/v1/archives", { items: identifiers, name })).address;
}

// The folders that lead to an item, the outermost first, with itself at the end.
export async function trailOf(folder) {
  const trail = [folder];
  while (trail[0].itemIdentifier !== ROOT && !trail[0].isContainer && trail.length < 100) {
    trail.unshift(await item(trail[0].parentItemIdentifier));
  }
  return trail;
}

// Events of a stream, one after the other: {event, data}.
export async function* events(body) {
  const reader = body.pipeThrough(new TextDecoderStream()).getReader();
  let text = "";
  while (true) {
    const { done, value } = await reader.read();
    if (done) {
      return;
    }
    text += value;
    let end;
    while ((end = text.indexOf("\n\n")) >= 0) {
      const event = { event: "message", data: "" };
      for (const line of text.slice(0, end).split("\n")) {
        const colon = line.indexOf(": ");
        event[line.slice(0, colon)] = line.slice(colon + 2);
      }
      text = text.slice(end + 2);
      yield event;
    }
  }
}

// Has an action done and answers the item as it is then.
export async function act(action, { signal, progressed = () => {} } = {}) {
  const answer = await send("/v1/actions", {
    method: "POST", headers: { "Content-Type": "application/json" },
    body: JSON.stringify(action), signal });
  if (!answer.ok) {
    throw await failureOf(answer);
  }
  for await (const { event, data } of events(answer.body)) {
    if (event === "progress") {
      progressed(JSON.parse(data));
    } else if (event === "done") {
      return JSON.parse(data);
    } else if (event === "failed") {
      throw new ServiceError(200, JSON.parse(data).error);
    }
  }
  throw new ConnectionError(t("errorConnection"));
}
