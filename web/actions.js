// What can be done to items: each asks where it must, does it, tells what was done, and offers to
// undo it where that can be.

import { act, addressOf, archiveOf, CAN, get, itemPath, ROOT } from "./api.js";
import { chooseFolder } from "./chooser.js";
import { button, h } from "./dom.js";
import { buttons, confirm, dialog, explain, tell, tellError } from "./dialogs.js";
import { shownName } from "./format.js";
import { t } from "./text.js";

function told(one, many, items) {
  return items.length === 1 ? t(one, { name: shownName(items[0].filename) })
    : t(many, { n: items.length });
}

// Does it for each; what fails is told once, with the others done.
async function forEach(items, work) {
  const done = [];
  let failure = null;
  for (const item of items) {
    try {
      done.push(await work(item) ?? item);
    } catch (error) {
      failure = error;
    }
  }
  if (failure) {
    tellError(failure);
  }
  return done;
}

export function needsArchive(items) {
  return items.length > 1 || items[0].isFolder || items[0].documentSize === undefined;
}

export function allow(items, capability) {
  return items.length > 0 && items.every((item) => item.capabilities & capability);
}

export class Actions {
  // `changed()` is called after each, so that what is shown is brought up to date.
  constructor(changed) {
    this.changed = changed;
    this.undo = null;
  }

  undoable(text, undo) {
    this.undo = async () => {
      this.undo = null;
      await undo();
      this.changed();
    };
    const mine = this.undo;
    tell(text, { label: t("undo"), act: () => this.undo === mine ? this.undo() : mine() });
  }

  async used(item) {
    try {
      await act({ action: "used", item: item.itemIdentifier, date: new Date().toISOString() });
      this.changed();
    } catch (error) {
      tellError(error);
    }
  }

  // One file as it is; folders, packages and several items as an archive, named after the one or
  // after the place that they are in.
  async download(items, placeName) {
    try {
      const name = (items.length === 1 ? items[0].filename : placeName) + ".zip";
      const address = needsArchive(items)
        ? await archiveOf(items.map((item) => item.itemIdentifier), name)
        : await addressOf(items[0].itemIdentifier, "download");
      const link = h("a", { href: address, download: "" });
      document.body.append(link);
      link.click();
      link.remove();
    } catch (error) {
      tellError(error);
    }
  }

  // A new folder under the first name that is free; answers it.
  async newFolder(folder) {
    const base = t("untitled");
    for (let number = 1; ; ++number) {
      try {
        const made = await act({ action: "create", parent: folder.itemIdentifier,
                                 name: number === 1 ? base : `${base} ${number}` });
        await this.changed();
        return made;
      } catch (error) {
        if (error.name !== "filenameCollision") {
          tellError(error);
          return null;
        }
      }
    }
  }

  async rename(item, name) {
    try {
      await act({ action: "rename", item: item.itemIdentifier, name });
      this.undoable(t("renamed", { name: shownName(name) }), () =>
        forEach([item], () => act({ action: "rename", item: item.itemIdentifier,
                                    name: item.filename })));
    } catch (error) {
      tell(error.name === "filenameCollision" ? t("nameTaken", { name: shownName(name) })
        : error.message, { isError: true });
    }
    await this.changed();
  }

  async moveInto(items, folder) {
    const moving = items.filter((item) => item.parentItemIdentifier !== folder.itemIdentifier &&
                                item.itemIdentifier !== folder.itemIdentifier);
    if ((folder.capabilities & CAN.write) === 0) {
      explain(t("refusedTitle"),
              t(folder.itemIdentifier === ROOT ? "refusedTop" : "refusedHere"));
      return;
    }
    const done = await forEach(moving, async (item) => {
      await act({ action: "move", item: item.itemIdentifier, parent: folder.itemIdentifier });
      return item;
    });
    if (done.length > 0) {
      // What came from the top level can't be put back there.
      const canGoBack = done.filter((item) => item.parentItemIdentifier !== ROOT);
      if (canGoBack.length === done.length) {
        this.undoable(told("moved", "movedMany", done), () => forEach(done, (item) =>
          act({ action: "move", item: item.itemIdentifier, parent: item.parentItemIdentifier })));
      } else {
        tell(told("moved", "movedMany", done));
      }
    }
    await this.changed();
  }

  async chooseAndMove(items) {
    const without = new Set(items.map((item) => item.itemIdentifier));
    const folder = await chooseFolder(t("moveTitle"), t("moveHere"), { without });
    if (folder) {
      await this.moveInto(items, folder);
    }
  }

  async trash(items) {
    const done = await forEach(items, (item) => act({ action: "trash", item: item.itemIdentifier }));
    if (done.length > 0) {
      this.undoable(told("trashed", "trashedMany", done), () => this.putBackQuietly(done));
    }
    await this.changed();
  }

  putBackQuietly(items) {
    return forEach(items, (item) => act({ action: "untrash", item: item.itemIdentifier }));
  }

  async putBack(items) {
    const done = await this.putBackQuietly(items);
    if (done.length > 0) {
      tell(told("putBackDone", "putBackMany", done));
    }
    await this.changed();
  }

  async deleteForGood(items) {
    const isAgreed = await confirm(told("deleteQuestion", "deleteManyQuestion", items),
                                   t("deleteWarning"), t("remove"), { danger: true });
    if (!isAgreed) {
      return;
    }
    const done = await forEach(items, async (item) => {
      await act({ action: "delete", item: item.itemIdentifier });
      return item;
    });
    if (done.length > 0) {
      tell(told("deleted", "deletedMany", done));
    }
    await this.changed();
  }

  async emptyTrash() {
    const tomorrow = new Date(Date.now() + 24 * 60 * 60 * 1000);
    const day = h("input", { type: "date", value: tomorrow.toLocaleDateString("sv"), autofocus: true });
    const before = await dialog(t("emptyQuestion"), (close) => [
      h("label", { class: "field" }, h("span", {}, t("emptyOlder")), day),
      h("p", {}, t("emptyExplain")),
      buttons(button(t("cancel"), null, () => close(null), { text: true }),
              button(t("remove"), null, () => close(day.value), { text: true, kind: "danger" }))]);
    if (!before) {
      return;
    }
    try {
      await act({ action: "purge", date: new Date(before + "T00:00:00").toISOString() });
      tell(t("emptied"));
    } catch (error) {
      tellError(error);
    }
    await this.changed();
  }

  async setFavorite(items, isFavorite) {
    await forEach(items, (item) => act(isFavorite
      ? { action: "favorite", item: item.itemIdentifier, rank: Date.now() }
      : { action: "favorite", item: item.itemIdentifier }));
    await this.changed();
  }

  async editTags(items) {
    const all = new Set(items.flatMap((item) => item.tags ?? []));
    const title = items.length === 1 ? t("tagsOf", { name: shownName(items[0].filename) })
      : t("tagsOfMany", { n: items.length });
    const known = h("datalist", { id: "known-tags" });
    get("/v1/tags").then(({ tags }) => known.append(
      ...tags.map(({ tag }) => h("option", { value: tag }))), tellError);
    const wanted = await dialog(title, (close) => {
      const list = h("ul", { class: "tag-list" });
      const show = () => list.replaceChildren(...[...all].map((tag) => h("li", { class: "tag" },
        h("bdi", {}, shownName(tag)),
        button(t("removeTag", { tag: shownName(tag) }), "close", () => {
          all.delete(tag);
          show();
          field.focus();
        }, { kind: "quiet" }))));
      const field = h("input", { list: "known-tags", autofocus: true, autocomplete: "off" });
      const add = () => {
        const tag = field.value.trim();
        if (tag !== "") {
          all.add(tag);
          field.value = "";
          show();
        }
      };
      field.addEventListener("keydown", (event) => {
        if (event.key === "Enter" && field.value.trim() !== "") {
          event.preventDefault();
          add();
        } else if (event.key === "Enter") {
          close([...all]);
        }
      });
      show();
      return [list, h("label", { class: "field" }, h("span", {}, t("addTag")), field),
              known,
              buttons(button(t("cancel"), null, () => close(null), { text: true }),
                      button(t("save"), null, () => { add(); close([...all]); },
                             { text: true, kind: "primary" }))];
    });
    if (wanted) {
      await forEach(items, (item) => act({ action: "tag", item: item.itemIdentifier, tags: wanted }));
      await this.changed();
    }
  }

  async copyAddress(item) {
    const address = `${location.origin}/#/item/${encodeURIComponent(item.itemIdentifier)}`;
    try {
      await navigator.clipboard.writeText(address);
      tell(t("copied"));
    } catch {
      await explain(t("copyAddress"), address);
    }
  }

  // The folder that something in the trash came from, as far as it is known.
  async placeOfOrigin(item) {
    return (await get(itemPath(item.itemIdentifier, "/put-back"))).folder;
  }
}

