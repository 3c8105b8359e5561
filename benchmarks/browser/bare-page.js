// What the page is compared with: a server that reads the folder with readdir and stat, and a page
// that shows the same rows with nothing else to it.

import { watch } from "node:fs";
import { readdir, stat } from "node:fs/promises";
import { createServer } from "node:http";
import { join } from "node:path";

const PAGE = `<!doctype html><meta charset="utf-8"><title>bare</title>
<style>#rows{height:640px;overflow-y:auto}.row{height:38px;content-visibility:auto;
contain-intrinsic-size:auto 38px;display:grid;grid-template-columns:1fr 150px 90px}</style>
<div id="rows"></div><script type="module">
const rows = document.getElementById("rows");
const shown = new Map();
function show({ name, date, size }) {
  let row = shown.get(name);
  if (!row) {
    row = document.createElement("div");
    row.className = "row";
    row.dataset.name = name;
    rows.append(row);
    shown.set(name, row);
  }
  row.replaceChildren(...[name, date, size].map((text) => {
    const cell = document.createElement("div");
    cell.textContent = text;
    return cell;
  }));
}
window.begin = async () => {
  // Every piece costs a layout of all that is there, so that many small ones never end.
  for (let at = 0, count = 200; ; at += count, count = 10000) {
    const items = await (await fetch("/page?at=" + at + "&count=" + count)).json();
    items.forEach(show);
    if (items.length < count) { break; }
  }
  window.isWhole = true;
};
new EventSource("/changes").onmessage = ({ data }) => show(JSON.parse(data));
</script>`;

async function factsOf(folder, name) {
  const { mtime, size } = await stat(join(folder, name));
  return { name, date: mtime.toISOString(), size };
}

export async function serveBarePage(folder) {
  let names = null;
  const readers = new Set();
  const watcher = watch(folder, async (_, name) => {
    const facts = JSON.stringify(await factsOf(folder, name));
    readers.forEach((reader) => reader.write(`data: ${facts}\n\n`));
  });
  const server = createServer(async (request, answer) => {
    const address = new URL(request.url, "http://bare");
    if (address.pathname === "/page") {
      names ??= await readdir(folder);
      const at = Number(address.searchParams.get("at"));
      answer.end(JSON.stringify(await Promise.all(
        names.slice(at, at + Number(address.searchParams.get("count"))).map((name) => factsOf(folder, name)))));
    } else if (address.pathname === "/changes") {
      answer.writeHead(200, { "Content-Type": "text/event-stream" });
      answer.write(": hello\n\n");
      readers.add(answer);
      request.on("close", () => readers.delete(answer));
    } else {
      answer.setHeader("Content-Type", "text/html");
      answer.end(PAGE);
    }
  });
  await new Promise((resolve) => server.listen(0, "127.0.0.1", resolve));
  return {
    address: `http://127.0.0.1:${server.address().port}/`,
    stop() {
      watcher.close();
      server.close();
      server.closeAllConnections();
    } };
}
