import assert from "node:assert/strict";
import { appendFile, mkdir, open, readdir, readFile, rename, stat, writeFile } from "node:fs/promises";
import { createServer } from "node:http";
import { connect } from "node:net";

import { run } from "./service.js";
import { test, until, untilNames } from "./suite.js";

// Sends bytes and answers all that comes back.
function raw(service, text) {
  return new Promise((resolve, reject) => {
    const socket = connect(new URL(service.origin).port, "127.0.0.1");
    let answer = "";
    socket.on("data", (data) => { answer += data.toString("latin1"); });
    socket.on("error", reject);
    socket.on("close", () => resolve(answer));
    socket.write(text);
  });
}

function statusOf(answer) {
  return Number(answer.split(" ")[1]);
}

function head(service, line, fields = {}) {
  const all = { Host: new URL(service.origin).host, Connection: "close", ...fields };
  return `${line} HTTP/1.1\r\n` + Object.entries(all).map(([name, value]) =>
    `${name}: ${value}\r\n`).join("") + "\r\n";
}

async function session(service) {
  const launch = new URL(service.address).hash.slice("#launch=".length);
  const answer = await fetch(service.origin + "/v1/sessions", {
    method: "POST", body: JSON.stringify({ launch }),
    headers: { "Content-Type": "application/json", Origin: service.origin } });
  assert.equal(answer.status, 200);
  const { session: token } = await answer.json();
  const ask = (path, options = {}) => fetch(service.origin + path, {
    ...options, headers: { "Marrowdale-Session": token, Origin: service.origin,
                           "Content-Type": "application/json", ...options.headers } });
  ask.token = token;
  return ask;
}

async function addressOf(ask, item, view) {
  const answer = await ask("/v1/addresses", { method: "POST", body: JSON.stringify({ item, view }) });
  return (await answer.json()).address;
}

async function identifierOf(stage, name) {
  return (await run(stage.home, "id", stage.home.document(name)))[0].itemIdentifier;
}

test("Security.nothingIsAnsweredWithoutASession", async (stage) => {
  await stage.home.write("secret.txt", "secret");
  const service = await stage.serve();
  const item = encodeURIComponent(await identifierOf(stage, "secret.txt"));
  for (const path of [`/v1/items/${item}`, `/v1/items/${item}/content`, "/v1/service", "/v1/space",
                      "/v1/signals", "/v1/sessions", "/v1/search?word=secret", "/v1/findings",
                      "/v1/collections/recents"]) {
    const answer = await raw(service, head(service, `GET ${path}`));
    assert.equal(statusOf(answer), 401, path);
    const wrong = await raw(service, head(service, `GET ${path}`, { "Marrowdale-Session": "0".repeat(64) }));
    assert.equal(statusOf(wrong), 401, path);
  }
  for (const path of [`/files/content/${item}`, `/files/download/${item}?session=1&until=99999999999&signature=x`]) {
    assert.equal(statusOf(await raw(service, head(service, `GET ${path}`))), 403, path);
  }
  for (const path of ["/etc/passwd", "/assets/../index.html", "/assets/none.js", "/socket"]) {
    assert.ok([400, 404].includes(statusOf(await raw(service, head(service, `GET ${path}`)))), path);
  }
  const launch = new URL(service.address).hash.slice("#launch=".length);
  await session(service);
  const again = await fetch(service.origin + "/v1/sessions", {
    method: "POST", body: JSON.stringify({ launch }),
    headers: { "Content-Type": "application/json", Origin: service.origin } });
  assert.equal(again.status, 403);
});

test("Security.otherNamesOriginsAndFormsAreRefused", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  const service = await stage.serve();
  const ask = await session(service);
  const item = await identifierOf(stage, "In/a.txt");
  const body = JSON.stringify({ action: "trash", item });
  const post = (fields) => raw(service, head(service, "POST /v1/actions", {
    Origin: service.origin, "Content-Type": "application/json", "Content-Length": body.length,
    "Marrowdale-Session": ask.token, ...fields }) + body);
  assert.equal(statusOf(await post({ Host: "rebound.example" })), 421);
  assert.equal(statusOf(await post({ Host: "rebound.example:" + new URL(service.origin).port })), 421);
  assert.equal(statusOf(await post({ Origin: "http://evil.example" })), 403);
  assert.equal(statusOf(await post({ Origin: "null" })), 403);
  assert.equal(statusOf(await post({ "Sec-Fetch-Site": "cross-site" })), 403);
  assert.equal(statusOf(await post({ "Sec-Fetch-Site": "same-site" })), 403);
  for (const type of ["text/plain", "application/x-www-form-urlencoded", "multipart/form-data"]) {
    assert.equal(statusOf(await post({ "Content-Type": type })), 415);
  }
  const preflight = await raw(service, head(service, "OPTIONS /v1/actions", {
    Origin: "http://evil.example", "Access-Control-Request-Method": "POST" }));
  assert.equal(statusOf(preflight), 405);
  assert.ok(!/access-control/i.test(preflight));
  assert.deepEqual(await readdir(stage.home.document("In")), ["a.txt"]);
  assert.equal(statusOf(await post({})), 200);
  assert.deepEqual(await readdir(stage.home.document("In")), []);
});

test("Security.aPageOfAnotherOriginGetsNothing", async (stage) => {
  await stage.home.write("In/a.txt", "secret text");
  const service = await stage.serve();
  const page = await stage.person();
  const item = await identifierOf(stage, "In/a.txt");
  const ask = await page.evaluate(() => localStorage.getItem("marrowdale-session"));
  const address = await page.evaluate(async (identifier) => {
    const { addressOf: make } = await import("/assets/api.js");
    return make(identifier, "download");
  }, item);
  // The same machine, another port: another origin of the same site.
  const evil = createServer((request, answer) => {
    answer.setHeader("Content-Type", "text/html");
    answer.end("<!doctype html><body></body>");
  });
  await new Promise((resolve) => evil.listen(0, "127.0.0.1", resolve));
  try {
    const attacker = await page.context().newPage();
    await attacker.goto(`http://127.0.0.1:${evil.address().port}/`);
    const results = await attacker.evaluate(async ({ origin, token, signed, identifier }) => {
      const tries = {
        plain: () => fetch(origin + "/v1/service"),
        session: () => fetch(origin + "/v1/service", { headers: { "Marrowdale-Session": token } }),
        opaque: async () => (await fetch(origin + signed, { mode: "no-cors" })).text(),
        form: async () => {
          await fetch(origin + "/v1/actions", { method: "POST", mode: "no-cors",
            body: JSON.stringify({ action: "trash", item: identifier }) });
          return "";
        },
        image: () => new Promise((resolve, reject) => {
          const image = new Image();
          image.onload = () => resolve("loaded");
          image.onerror = () => reject(new Error("not loaded"));
          image.src = origin + "/assets/icon.svg";
        }),
        script: () => new Promise((resolve, reject) => {
          const script = document.createElement("script");
          script.onload = () => resolve("loaded");
          script.onerror = () => reject(new Error("not loaded"));
          script.src = origin + "/assets/text.js";
          document.body.append(script);
        }) };
      const seen = {};
      for (const [name, attempt] of Object.entries(tries)) {
        try {
          const answer = await attempt();
          seen[name] = typeof answer === "string" ? answer : String(answer.status);
        } catch {
          seen[name] = "nothing";
        }
      }
      return seen;
    }, { origin: service.origin, token: ask, signed: address, identifier: item });
    for (const [name, seen] of Object.entries(results)) {
      assert.ok(seen === "nothing" || seen === "", `${name}: ${seen}`);
    }
    // A frame of it shows nothing.
    await attacker.setContent(`<iframe src="${service.origin}/"></iframe>`);
    const frame = attacker.frames().find((each) => each !== attacker.mainFrame());
    await until(() => frame.url().startsWith("chrome-error:") || frame.url() === "");
    assert.deepEqual(await readdir(stage.home.document("In")), ["a.txt"]);
  } finally {
    evil.close();
    evil.closeAllConnections();
  }
});

test("Security.thePageRunsItsOwnScriptsAlone", async (stage) => {
  await stage.home.write("a.txt", "");
  const service = await stage.serve();
  const answer = await fetch(service.origin + "/");
  const policy = answer.headers.get("content-security-policy");
  assert.match(policy, /^default-src 'none'; script-src 'self'; style-src 'self'/);
  assert.match(policy, /frame-ancestors 'none'/);
  assert.doesNotMatch(policy, /unsafe|https?:|\*/);
  assert.equal(answer.headers.get("access-control-allow-origin"), null);
  const page = await stage.person();
  const ran = await page.evaluate(() => {
    window.ran = false;
    const script = document.createElement("script");
    try {
      script.textContent = "window.ran = true";
      document.head.append(script);
    } catch {
      return "refused";
    }
    return window.ran ? "ran" : "refused";
  });
  assert.equal(ran, "refused");
  stage.problems = stage.problems.filter((text) => !/Content Security Policy|TrustedScript/.test(text));
});

test("Security.theMachinesFilesCannotBeBroughtIn", async (stage) => {
  await stage.home.write("In/a.txt", "");
  const service = await stage.serve();
  const ask = await session(service);
  const parent = await identifierOf(stage, "In");
  const answer = await ask("/v1/actions", { method: "POST", body: JSON.stringify(
    { action: "import", path: "/etc/passwd", parent }) });
  assert.equal(answer.status, 403);
  for (const name of ["", ".", "..", "a/b", "../x", "x\0y", "n".repeat(256)]) {
    const upload = await ask(`/v1/uploads?parent=${encodeURIComponent(parent)}&name=${encodeURIComponent(name)}`,
                             { method: "PUT", body: "x", headers: { "Content-Type": "application/octet-stream" } });
    assert.equal(upload.status, 400, name);
  }
  const top = await ask("/v1/uploads?parent=VantrelRootContainerItemIdentifier&name=x",
                        { method: "PUT", body: "x", headers: { "Content-Type": "application/octet-stream" } });
  assert.equal(top.status, 403);
  assert.equal((await top.json()).error.name, "writeNoPermission");
  assert.deepEqual(await readdir(stage.home.root), ["In"]);
});

test("Security.signedAddressesEndWithTheirSession", async (stage) => {
  await stage.home.write("In/a.html", "<script>1</script>");
  const service = await stage.serve();
  const ask = await session(service);
  const item = await identifierOf(stage, "In/a.html");
  const shown = await addressOf(ask, item, "content");
  const answer = await fetch(service.origin + shown);
  assert.equal(answer.status, 200);
  assert.equal(answer.headers.get("content-type"), "application/octet-stream");
  assert.match(answer.headers.get("content-disposition"), /^attachment/);
  assert.match(answer.headers.get("content-security-policy"), /sandbox/);
  assert.equal((await fetch(service.origin + shown.replace("content", "download"))).status, 403);
  assert.equal((await fetch(service.origin + shown.replace(/until=\d/, "until=9"))).status, 403);
  const { sessions } = await (await ask("/v1/sessions")).json();
  assert.equal(sessions.length, 1);
  assert.equal((await ask(`/v1/sessions/${sessions[0].number}`, { method: "DELETE" })).status, 200);
  assert.equal((await fetch(service.origin + shown)).status, 403);
  assert.equal((await ask("/v1/service")).status, 401);
});

test("Security.partsOfSparseGrowingAndReplacedFilesAreRight", async (stage) => {
  await stage.home.write("In/sparse", "");
  await stage.home.write("In/doc", "x".repeat(30_000_000));
  const sparse = await open(stage.home.document("In/sparse"), "r+");
  await sparse.truncate(5_000_000_000);
  await sparse.write("end", 4_999_999_997);
  await sparse.close();
  const service = await stage.serve();
  const ask = await session(service);
  const address = service.origin + await addressOf(ask, await identifierOf(stage, "In/sparse"), "download");
  const part = await fetch(address, { headers: { Range: "bytes=4999999990-" } });
  assert.equal(part.status, 206);
  assert.equal(part.headers.get("content-range"), "bytes 4999999990-4999999999/5000000000");
  assert.deepEqual(Buffer.from(await part.arrayBuffer()), Buffer.from("\0\0\0\0\0\0\0end"));
  assert.equal((await fetch(address, { headers: { Range: "bytes=5000000000-" } })).status, 416);

  const document = stage.home.document("In/doc");
  const download = service.origin + await addressOf(ask, await identifierOf(stage, "In/doc"), "download");
  const begun = await fetch(download);
  const tag = begun.headers.get("etag");
  await writeFile(document + ".new", "new content");
  await rename(document + ".new", document);
  const old = Buffer.from(await begun.arrayBuffer());
  assert.equal(old.length, 30_000_000);
  assert.ok(old.every((byte) => byte === 0x78));
  const rest = await fetch(download, { headers: { Range: "bytes=3-", "If-Range": tag } });
  assert.equal(rest.status, 200);
  assert.equal(await rest.text(), "new content");

  await stage.home.write("In/grows", "y".repeat(20_000_000));
  const growing = await fetch(service.origin +
    await addressOf(ask, await identifierOf(stage, "In/grows"), "download"));
  await appendFile(stage.home.document("In/grows"), "more");
  assert.equal((await growing.arrayBuffer()).byteLength, 20_000_000);
});

test("Security.linksLeadNobodyOutOfTheDocuments", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await stage.home.write("../outside.txt", "outside");
  const { symlink } = await import("node:fs/promises");
  await symlink(stage.home.path + "/outside.txt", stage.home.document("In/link.txt"));
  const service = await stage.serve();
  const ask = await session(service);
  const item = encodeURIComponent(await identifierOf(stage, "In/link.txt"));
  const answer = await ask(`/v1/items/${item}/content`);
  assert.equal(answer.status, 404);
  assert.ok(!(await answer.text()).includes("outside\""));
});

test("Security.fiveHundredIdleStreamsCostLittleAndKeepNobodyWaiting", async (stage) => {
  await stage.home.write("a.txt", "a");
  const service = await stage.serve();
  const ask = await session(service);
  const memory = async () => Number(/VmRSS:\s+(\d+)/.exec(
    await readFile(`/proc/${service.child.pid}/status`, "utf8"))[1]);
  await ask("/v1/service");
  const before = await memory();
  const sockets = [];
  for (let i = 0; i < 500; ++i) {
    const socket = connect(new URL(service.origin).port, "127.0.0.1");
    socket.on("error", () => {});
    const isReady = new Promise((resolve) => socket.on("data", (data) =>
      String(data).includes("event: ready") && resolve()));
    socket.write(`GET /v1/signals HTTP/1.1\r\nHost: ${new URL(service.origin).host}\r\n` +
      `Marrowdale-Session: ${ask.token}\r\n\r\n`);
    sockets.push(socket);
    await isReady;
  }
  assert.ok(await memory() - before < 64 * 1024, `${await memory() - before} KiB`);
  const times = [];
  for (let i = 0; i < 200; ++i) {
    const begun = performance.now();
    assert.equal((await ask("/v1/items/VantrelRootContainerItemIdentifier")).status, 200);
    times.push(performance.now() - begun);
  }
  times.sort((a, b) => a - b);
  console.log(`99th percentile of 200 answers beside 500 streams: ${times[198].toFixed(1)} ms`);
  assert.ok(times[198] < 100);
  sockets.forEach((socket) => socket.destroy());
});

test("Security.uploadsGoToDiskWithoutBeingInMemory", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  const service = await stage.serve();
  const ask = await session(service);
  const parent = encodeURIComponent(await identifierOf(stage, "In"));
  const peak = async () => Number(/VmHWM:\s+(\d+)/.exec(
    await readFile(`/proc/${service.child.pid}/status`, "utf8"))[1]);
  const before = await peak();
  const size = 200_000_000;
  const answer = await ask(`/v1/uploads?parent=${parent}&name=large`, {
    method: "PUT", body: Buffer.alloc(size, "x"),
    headers: { "Content-Type": "application/octet-stream" } });
  assert.equal(answer.status, 200);
  assert.equal((await stat(stage.home.document("In/large"))).size, size);
  assert.ok(await peak() - before < 16 * 1024, `${await peak() - before} KiB`);
  // A taken name stays what it is.
  const taken = await ask(`/v1/uploads?parent=${parent}&name=a.txt`, {
    method: "PUT", body: "other", headers: { "Content-Type": "application/octet-stream" } });
  assert.equal(taken.status, 409);
  assert.equal(await readFile(stage.home.document("In/a.txt"), "utf8"), "a");
});

test("Serve.saysWhatIsWrongWithItsOptions", async (stage) => {
  const failing = async (...args) => run(stage.home, ...args).then(() => "", (error) => error.message);
  assert.match(await failing("serve", "--keep-trash", "soon"), /--keep-trash wants a number of days/);
  assert.match(await failing("serve", "--port", "99999"), /error/);
  const service = await stage.serve();
  const port = new URL(service.origin).port;
  await mkdir(stage.home.path + "/other");
  const other = { environment: { ...stage.home.environment, HOME: stage.home.path + "/other" },
                  root: stage.home.path };
  assert.match(await run(other, "serve", "--port", port).then(() => "", (error) => error.message),
               /listen at.*127\.0\.0\.1/);
});

test("Serve.whatWasTrashedLongAgoGoesWhenItStarts", async (stage) => {
  await stage.home.write("In/a.txt", "a");
  await run(stage.home, "trash", stage.home.document("In/a.txt"));
  await stage.serve(["--port", "0", "--keep-trash", "forever"]);
  const page = await stage.person({}, "#/trash");
  await untilNames(page, ["a.txt"]);
  await stage.service.stop();
  await stage.serve(["--port", "0", "--keep-trash", "0"]);
  await until(async () => (await readdir(stage.home.document(".Trash"))).length === 0);
});

test("Serve.withoutTheBrowserThereIsNoAddress", async (stage) => {
  const { spawn } = await import("node:child_process");
  const { program } = await import("./service.js");
  const child = spawn(program, ["--json", "serve", "--no-browser"], { env: stage.home.environment });
  const line = await new Promise((resolve) => child.stdout.once("data", (text) => resolve(String(text))));
  child.kill();
  await new Promise((resolve) => child.on("exit", resolve));
  assert.deepEqual(Object.keys(JSON.parse(line)), ["serving"]);
});

