// Uploads: files and folders, three at a time, with progress, a way to stop each, and a question
// where a name is taken.

import { act, failureOf, get, headers, itemPath, ServiceError } from "./api.js";
import { button, h } from "./dom.js";
import { buttons, dialog } from "./dialogs.js";
import { shownName, shownSize } from "./format.js";
import { t } from "./text.js";

const AT_ONCE = 3;

// "name 2.ext"
export function nextName(name, number) {
  const dot = name.lastIndexOf(".");
  const [base, extension] = dot > 0 ? [name.slice(0, dot), name.slice(dot)] : [name, ""];
  return t("copyOf", { base, n: number, extension });
}

export class Uploads {
  // `done()` is called after each.
  constructor(done) {
    this.done = done;
    this.waiting = [];
    this.running = new Set();
    this.total = 0;
    this.finished = 0;
    this.answerForAll = null;
    this.asking = Promise.resolve();
    this.title = h("h2", { "aria-live": "polite" });
    this.list = h("ul", {});
    this.element = h("section", { class: "uploads", "aria-label": t("uploads"), hidden: true },
      h("div", { class: "dialog-head" }, this.title,
        button(t("cancelAll"), null, () => this.cancelAll(), { text: true, kind: "link" }),
        button(t("close"), "close", () => this.hide(), { kind: "quiet" })),
      this.list);
  }

  hide() {
    this.element.hidden = true;
  }

  // Files and entries of folders as a drop brings them, or a field with files.
  async addDropped(transfer, folder) {
    await this.addTaken(Uploads.take(transfer), folder);
  }

  // What a drop brings, to be asked for at once: afterwards the web browser tells nothing any more.
  static take(transfer) {
    return [...transfer.items].filter((item) => item.kind === "file")
      .map((item) => ({ entry: item.webkitGetAsEntry?.(), file: item.getAsFile?.() }));
  }

  async addTaken(dropped, folder) {
    for (const { entry, file } of dropped) {
      if (entry) {
        await this.addEntry(entry, folder);
      } else if (file) {
        this.add(file, folder);
      }
    }
  }

  async addEntry(entry, folder) {
    if (entry.isFile) {
      const file = await new Promise((resolve, reject) => entry.file(resolve, reject));
      this.add(file, folder);
      return;
    }
    const made = await this.folderIn(folder, entry.name);
    const reader = entry.createReader();
    while (made) {
      const some = await new Promise((resolve, reject) => reader.readEntries(resolve, reject));
      if (some.length === 0) {
        return;
      }
      for (const inner of some) {
        await this.addEntry(inner, made);
      }
    }
  }

  async addFiles(files, folder) {
    const folders = new Map([["", folder]]);
    for (const file of files) {
      const parts = (file.webkitRelativePath || file.name).split("/").slice(0, -1);
      let path = "";
      let place = folder;
      for (const part of parts) {
        path += part + "/";
        if (!folders.has(path)) {
          folders.set(path, place && await this.folderIn(place, part));
        }
        place = folders.get(path);
      }
      if (place) {
        this.add(file, place);
      }
    }
  }

  // A folder of that name: a new one, or the one that is there.
  async folderIn(parent, name) {
    try {
      return await act({ action: "create", parent: parent.itemIdentifier, name });
    } catch (error) {
      if (error.name === "filenameCollision" && error.details.item?.isFolder) {
        return error.details.item;
      }
      this.failed(this.line(name), error);
      return null;
    }
  }

  add(file, folder) {
    this.waiting.push({ file, folder, name: file.name, line: this.line(file.name) });
    this.total += 1;
    this.go();
  }

  line(name) {
    this.element.hidden = false;
    const bar = h("progress", { max: "1", value: "0", "aria-label": shownName(name) });
    const state = h("span", { class: "hint" }, t("waiting"));
    const line = h("li", {}, h("bdi", { class: "upload-name" }, shownName(name)), state, bar);
    line.bar = bar;
    line.state = state;
    this.list.append(line);
    return line;
  }

  tellHowFar() {
    this.title.textContent = this.running.size + this.waiting.length > 0
      ? t("uploading", { n: this.finished + 1, total: this.total })
      : t("uploaded", { n: this.finished });
  }

  go() {
    while (this.running.size < AT_ONCE && this.waiting.length > 0) {
      const upload = this.waiting.shift();
      this.running.add(upload);
      this.run(upload).finally(() => {
        this.running.delete(upload);
        this.done();
        this.go();
      });
    }
    this.tellHowFar();
    if (this.running.size === 0) {
      this.answerForAll = null;
    }
  }

  async run(upload) {
    const stop = button(t("cancel"), "close", () => upload.request?.abort(), { kind: "quiet" });
    upload.line.append(stop);
    try {
      await this.sendUntilTaken(upload);
      this.finished += 1;
      upload.line.remove();
      this.hideSoon();
    } catch (error) {
      this.failed(upload.line, error);
    } finally {
      stop.remove();
    }
  }

  hideSoon() {
    setTimeout(() => {
      if (this.running.size + this.waiting.length + this.list.children.length === 0) {
        this.hide();
        this.total = this.finished = 0;
      }
    }, 3000);
  }

  failed(line, error) {
    line.bar.remove();
    const isStop = error.name === "AbortError";
    line.classList.toggle("error", !isStop && error.name !== "skipped");
    line.state.textContent = isStop ? t("cancelled") : error.name === "skipped" ? t("skipped")
      : t("uploadFailed", { reason: error.message });
    line.append(button(t("close"), "close", () => line.remove(), { kind: "quiet" }));
  }

  async sendUntilTaken(upload) {
    for (let number = 2; ; ++number) {
      try {
        await this.send(upload);
        return;
      } catch (error) {
        if (error.name !== "filenameCollision") {
          throw error;
        }
        const answer = upload.answer ?? await this.ask(upload, error.details.item);
        if (answer === "replace") {
          await act({ action: "trash", item: error.details.item.itemIdentifier });
        } else if (answer === "keep") {
          upload.answer = "keep";
          upload.name = nextName(upload.file.name, number);
        } else {
          throw new ServiceError(409, { name: "skipped", message: t("skipped") });
        }
      }
    }
  }

  // One question at a time.
  ask(upload, taken) {
    this.asking = this.asking.then(() => this.answerForAll ?? this.askNow(upload, taken));
    return this.asking;
  }

  async askNow(upload, taken) {
    const all = h("input", { type: "checkbox" });
    const name = shownName(upload.name);
    const answer = await dialog(t("conflictTitle", { name }), (close) => [
      h("p", {}, t("conflictText", { folder: shownName(upload.folder.filename) })),
      h("label", { class: "check" }, all, h("span", {}, t("forAll"))),
      buttons(button(t("skip"), null, () => close("skip"), { text: true }),
              taken ? button(t("replace"), null, () => close("replace"), { text: true }) : null,
              button(t("keepBoth"), null, () => close("keep"),
                     { text: true, kind: "primary", autofocus: true }))]) ?? "skip";
    if (all.checked) {
      this.answerForAll = answer;
    }
    return answer;
  }

  send(upload) {
    return new Promise((resolve, reject) => {
      const request = new XMLHttpRequest();
      upload.request = request;
      upload.line.state.textContent = shownSize(upload.file.size);
      request.open("PUT", `/v1/uploads?parent=${encodeURIComponent(upload.folder.itemIdentifier)}` +
        `&name=${encodeURIComponent(upload.name)}`);
      for (const [name, value] of Object.entries(
        headers({ "Content-Type": "application/octet-stream" }))) {
        request.setRequestHeader(name, value);
      }
      request.upload.onprogress = ({ loaded, total }) => {
        upload.line.bar.value = total > 0 ? loaded / total : 0;
      };
      request.onload = async () => {
        const answer = new Response(request.responseText, { status: request.status });
        if (answer.ok) {
          resolve();
        } else {
          reject(await failureOf(answer));
        }
      };
      request.onerror = () => reject(new Error(t("errorConnection")));
      request.onabort = () => reject(new DOMException("", "AbortError"));
      request.send(upload.file);
    });
  }

  cancelAll() {
    for (const upload of this.waiting.splice(0)) {
      this.failed(upload.line, new DOMException("", "AbortError"));
    }
    this.running.forEach((upload) => upload.request?.abort());
    this.tellHowFar();
  }
}

// The folders in a folder, for choosing one.
export async function foldersIn(identifier) {
  const folders = [];
  let page = "name";
  while (page !== null) {
    const answer = await get(itemPath(identifier, `/children?page=${encodeURIComponent(page)}`));
    folders.push(...answer.items.filter((item) => item.isFolder));
    page = answer.nextPage;
  }
  return folders;
}
