// The items of one place, in order, and how they are kept right.

import { get, item as itemOf, itemPath, ROOT, ServiceError, WORKING_SET } from "./api.js";
import { kindOf, naturalKey } from "./format.js";

const KEYS = {
  name: (item) => item.sortName,
  modified: (item) => item.contentModificationDate ?? "",
  size: (item) => item.documentSize ?? -1,
  kind: (item) => kindOf(item).name,
  used: (item) => item.lastUsedDate ?? "",
  rank: (item) => item.favoriteRank ?? 0,
};

function compare(a, b) {
  return a < b ? -1 : a > b ? 1 : 0;
}

// Folders before files; equal ones by name, then by identifier, so that the order is always one.
function comparison({ key, descending }) {
  const value = KEYS[key];
  const sign = descending ? -1 : 1;
  return (a, b) => b.isFolder - a.isFolder || sign * compare(value(a), value(b)) ||
    compare(a.sortName, b.sortName) || compare(a.itemIdentifier, b.itemIdentifier);
}

// A place: what is listed, how its changes are learned, and what it is called. `follows` places are
// told what changed; the others are asked again as a whole.
export class Place {
  constructor(kind, value = "") {
    this.kind = kind;
    this.value = value;
  }

  get key() {
    return `${this.kind}/${this.value}`;
  }

  get follows() {
    return this.kind === "folder";
  }

  get listed() {
    return this.kind === "trash" ? WORKING_SET : this.value;
  }

  get defaultOrder() {
    return { recents: { key: "used", descending: true },
             favorites: { key: "rank", descending: false } }[this.kind] ??
      { key: "name", descending: false };
  }

  async *pages(signal) {
    if (this.kind === "folder" || this.kind === "trash") {
      let page = "name";
      while (page !== null) {
        const answer = await get(itemPath(this.listed,
          `/children?page=${encodeURIComponent(page)}`), { signal });
        yield this.kind === "trash" ? answer.items.filter((item) => item.isTrashed) : answer.items;
        page = answer.nextPage;
      }
      return;
    }
    yield (await get(this.collectionPath(), { signal })).items;
  }

  collectionPath() {
    if (this.kind === "search") {
      const words = this.value.split(/\s+/).filter((word) => word !== "");
      return "/v1/search?" + words.map((word) => `word=${encodeURIComponent(word)}`).join("&");
    }
    if (this.kind === "tagged") {
      return `/v1/collections/tagged?tag=${encodeURIComponent(this.value)}`;
    }
    return `/v1/collections/${this.kind}`;
  }
}

export class Listing extends EventTarget {
  constructor(place) {
    super();
    this.place = place;
    this.order = place.defaultOrder;
    this.filter = "";
    this.all = [];    // in order
    this.items = [];  // those that fit the filter
    this.byID = new Map();
    this.byFile = new Map();
    this.state = "loading";  // "ready", "error", "gone"
    this.error = null;
    this.folder = null;      // the item that is listed, of a folder
    this.anchor = null;
    this.stop = new AbortController();
    this.refreshing = null;
    this.isDue = false;
  }

  close() {
    this.stop.abort();
  }

  changed(detail = {}) {
    this.items = this.filter === "" ? this.all : this.all.filter((item) => this.fits(item));
    this.dispatchEvent(new CustomEvent("change", { detail }));
  }

  setFilter(text) {
    this.filter = naturalKey(text.trim());
    this.changed();
  }

  fits(item) {
    return item.sortName.includes(this.filter);
  }

  // Whether an item of that identifier is among those that are shown.
  has(identifier) {
    const item = this.byID.get(identifier);
    return item !== undefined && (this.filter === "" || this.fits(item));
  }

  setOrder(order) {
    this.order = order;
    this.all.sort(comparison(order));
    this.changed({ isReordered: true });
  }

  // Where an item is among those that are shown; -1 where it is not.
  indexOf(identifier) {
    const item = this.byID.get(identifier);
    if (!item) {
      return -1;
    }
    const before = comparison(this.order);
    let low = 0;
    let high = this.items.length;
    while (low < high) {
      const middle = (low + high) >> 1;
      if (before(this.items[middle], item) < 0) {
        low = middle + 1;
      } else {
        high = middle;
      }
    }
    return this.items[low] === item ? low : -1;
  }

  async load() {
    this.state = "loading";
    this.changed();
    try {
      await this.list();
      this.state = "ready";
    } catch (error) {
      this.fail(error);
    }
    this.changed();
    if (this.isDue) {
      this.refresh();
    }
  }

  fail(error) {
    if (error.name === "AbortError") {
      return;
    }
    this.error = error;
    this.state = error.name === "noSuchItem" ? "gone" : "error";
  }

  // The anchor comes first: what happens while pages are read is followed from there. A listing
  // that expires on the way begins again.
  async list() {
    const signal = this.stop.signal;
    for (let attempt = 1; ; ++attempt) {
      try {
        await this.listOnce(signal);
        return;
      } catch (error) {
        if (error.name !== "syncAnchorExpired" || attempt === 5) {
          throw error;
        }
      }
    }
  }

  async listOnce(signal) {
    const seen = new Set();
    if (this.place.follows) {
      this.folder = await itemOf(this.place.value);
      if (this.folder.isTrashed) {
        throw new ServiceError(404, { name: "noSuchItem" });
      }
      this.anchor = (await get(itemPath(this.place.listed, "/anchor"), { signal })).anchor;
    }
    for await (const items of this.place.pages(signal)) {
      const fitting = items.filter((item) => this.shows(item));
      fitting.forEach((item) => seen.add(item.itemIdentifier));
      this.put(fitting);
      this.changed();
    }
    const gone = [...this.byID.keys()].filter((identifier) => !seen.has(identifier));
    this.drop(gone);
  }

  // Applications have places of their own in the sidebar.
  shows(item) {
    return !(this.place.value === ROOT && item.isContainer);
  }

  put(items) {
    this.drop(items.map((item) => item.itemIdentifier));
    for (const item of items) {
      item.sortName = naturalKey(item.filename);
      item.isFolder = Boolean(item.isFolder);
      this.byID.set(item.itemIdentifier, item);
      if (item.fileID !== undefined) {
        this.byFile.set(item.fileID, item.itemIdentifier);
      }
    }
    this.merge([...items].sort(comparison(this.order)));
  }

  // Two sorted lists become one; where each new item goes is found by halving.
  merge(items) {
    const before = comparison(this.order);
    const merged = [];
    let from = 0;
    for (const item of items) {
      let low = from;
      let high = this.all.length;
      while (low < high) {
        const middle = (low + high) >> 1;
        if (before(this.all[middle], item) < 0) {
          low = middle + 1;
        } else {
          high = middle;
        }
      }
      for (; from < low; ++from) {
        merged.push(this.all[from]);
      }
      merged.push(item);
    }
    for (; from < this.all.length; ++from) {
      merged.push(this.all[from]);
    }
    this.all = merged;
  }

  drop(identifiers) {
    const gone = new Set();
    for (const identifier of identifiers) {
      const item = this.byID.get(identifier);
      if (item) {
        gone.add(item);
        this.byID.delete(identifier);
        if (this.byFile.get(item.fileID) === identifier) {
          this.byFile.delete(item.fileID);
        }
      }
    }
    if (gone.size > 0) {
      this.all = this.all.filter((item) => !gone.has(item));
    }
  }

  // Brings the items up to date; whoever asks while that goes on waits for one more round.
  refresh() {
    if (this.state === "loading") {
      this.isDue = true;
      return Promise.resolve();
    }
    if (this.refreshing) {
      this.isDue = true;
      return this.refreshing;
    }
    this.refreshing = this.refreshNow().finally(() => {
      this.refreshing = null;
      if (this.isDue && !this.stop.signal.aborted) {
        this.refresh();
      }
    });
    return this.refreshing;
  }

  async refreshNow() {
    this.isDue = false;
    try {
      const wasGone = this.state !== "ready";
      if (this.place.follows && this.anchor && !wasGone) {
        await this.follow();
      } else {
        await this.list();
        this.state = "ready";
        this.changed({ isUpdate: true });
      }
    } catch (error) {
      if (error.name === "syncAnchorExpired") {
        this.anchor = null;
        this.isDue = true;
      } else if (error instanceof ServiceError) {
        this.fail(error);
        this.changed();
      }
      // A lost connection is told elsewhere, and what is shown stays.
    }
  }

  async follow() {
    const signal = this.stop.signal;
    const before = this.anchor;
    for (let isMoreComing = true; isMoreComing;) {
      const answer = await get(itemPath(this.place.listed,
        `/changes?since=${encodeURIComponent(this.anchor)}`), { signal });
      this.apply(answer);
      this.anchor = answer.anchor;
      isMoreComing = answer.moreComing;
    }
    const folder = await itemOf(this.place.value);
    if (folder.isTrashed) {
      throw new ServiceError(404, { name: "noSuchItem" });
    }
    const isRenamed = folder.filename !== this.folder.filename ||
      folder.parentItemIdentifier !== this.folder.parentItemIdentifier;
    this.folder = folder;
    if (before !== this.anchor || isRenamed) {
      this.changed({ isUpdate: true, isRenamed });
    }
  }

  // Deletions come first; a deleted "fid=N" also means the item known by that file number.
  apply({ updated, deleted }) {
    const gone = [...deleted];
    for (const identifier of deleted) {
      const number = /^fid=(\d+)$/.exec(identifier)?.[1];
      const known = number === undefined ? undefined : this.byFile.get(Number(number));
      if (known) {
        gone.push(known);
      }
    }
    this.drop(gone);
    const here = [];
    const elsewhere = [];
    for (const item of updated) {
      const isHere = item.parentItemIdentifier === this.place.value && !item.isTrashed &&
        item.itemIdentifier !== this.place.value;
      (isHere && this.shows(item) ? here : elsewhere).push(item);
    }
    this.drop(elsewhere.map((item) => item.itemIdentifier));
    this.put(here);
  }
}
