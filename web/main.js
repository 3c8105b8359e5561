// The page: where one is, what is shown there, and what can be done.

import { Actions, allow, needsArchive } from "./actions.js";
import { act, begin, CAN, get, isAnswering, item as itemOf, post, remove, ROOT, takeUp, trailOf,
         whenSessionBegins, whenSessionEnds } from "./api.js";
import { chooseFolder } from "./chooser.js";
import { Details } from "./details.js";
import { buttons, dialog, explain, menu, menuBelow, messages, tell, tellError } from "./dialogs.js";
import { button, h, icon } from "./dom.js";
import { fullDate, shownClient, shownCount, shownName } from "./format.js";
import { Listing, Place } from "./listing.js";
import { listen } from "./live.js";
import { isPreviewed, preview } from "./preview.js";
import { Sidebar } from "./sidebar.js";
import { language, t } from "./text.js";
import { Uploads } from "./uploads.js";
import { View } from "./view.js";

const DRAGGED = "application/x-marrowdale-items";
const SEARCH_PAUSE = 150;
const SLOW = 1200;

document.documentElement.lang = language.slice(0, 2);

// "#/item/did%3D12" and the like, taken apart.
function placeInAddress() {
  const [, kind = "", value = ""] = /^#\/([a-z]*)\/?(.*)$/.exec(location.hash) ?? [];
  const text = decodeURIComponent(value);
  switch (kind) {
    case "item": return { identifier: text };
    case "tags": return { place: new Place("tagged", text) };
    case "search": return { place: new Place("search", text) };
    case "favorites": case "recents": case "trash": return { place: new Place(kind) };
    default: return { place: new Place("folder", ROOT) };
  }
}

function addressOfItem(identifier) {
  return identifier === ROOT ? "#/" : `#/item/${encodeURIComponent(identifier)}`;
}

class Page {
  constructor(root) {
    this.listing = null;
    this.draggedItems = [];
    this.actions = new Actions(() => this.refresh());
    this.uploads = new Uploads(() => this.refresh());
    this.sidebar = new Sidebar(this);
    this.details = new Details(this.actions);
    this.view = new View(this);
    this.view.addEventListener("selection", () => this.selectionChanged());
    this.view.addEventListener("order", () => this.tellOrder());
    this.build(root);
    addEventListener("hashchange", () => this.go());
    addEventListener("keydown", (event) => this.pressed(event));
  }

  build(root) {
    this.heading = h("h1", { class: "unseen" });
    this.crumbs = h("nav", { class: "crumbs", "aria-label": t("breadcrumbs") });
    this.search = h("input", { type: "search", class: "search", placeholder: t("search"),
                               "aria-label": t("search"), spellcheck: "false",
                               oninput: () => this.searchTyped(),
                               onkeydown: (event) => this.searchKey(event) });
    this.modeButton = button("", "grid", () => this.toggleMode());
    this.folderButton = button(t("newFolder"), "newFolder", () => this.newFolder());
    this.uploadButton = button(t("upload"), "upload", () => this.uploadWanted(),
                               { text: true, kind: "primary", "aria-haspopup": "menu" });
    this.status = h("p", { class: "status", role: "status" });
    this.state = h("div", { class: "state", hidden: true });
    this.banner = h("div", { class: "banner", role: "alert", hidden: true });
    this.refusal = h("p", { class: "refusal", hidden: true, id: "refusal" });
    this.filter = h("input", { type: "text", class: "filter-field", placeholder: t("filterHint"),
                               "aria-label": t("filterHere"), spellcheck: "false",
                               oninput: () => this.filterTyped(),
                               onkeydown: (event) => this.filterKey(event) });
    this.filterBar = h("div", { class: "filter", hidden: true }, icon("filter"), this.filter,
      button(t("close"), "close", () => this.closeFilter(), { kind: "quiet" }));
    this.filterButton = button(t("filterHere"), "filter", () => this.toggleFilter(),
                               { "aria-expanded": "false" });
    const toolbar = h("div", { class: "toolbar", role: "toolbar", "aria-label": t("actions") },
      this.folderButton, this.uploadButton, this.filterButton, this.modeButton,
      button(t("details"), "info", () => { this.details.toggle(); this.selectionChanged(); }),
      button(t("more"), "more", (event) => this.moreMenu(event.currentTarget),
             { "aria-haspopup": "menu" }));
    this.files = h("input", { type: "file", multiple: true, hidden: true,
                              onchange: () => this.filesChosen(this.files) });
    this.directories = h("input", { type: "file", webkitdirectory: true, hidden: true,
                                    onchange: () => this.filesChosen(this.directories) });
    const menuButton = button(t("menu"), "menu", () => {
      this.sidebar.element.classList.toggle("open");
    }, { kind: "quiet sidebar-button" });
    const main = h("main", { class: "main",
                             ondragover: (event) => this.draggedOver(event),
                             ondragleave: () => main.classList.remove("drop"),
                             ondrop: (event) => this.droppedHere(event) },
      this.heading, this.refusal, this.filterBar, this.view.element, this.state);
    this.main = main;
    this.showMode();
    root.replaceChildren(this.sidebar.element,
      h("div", { class: "page" }, h("header", { class: "head" },
        h("div", { class: "head-row" }, menuButton, this.crumbs, this.search),
        toolbar), this.banner, main,
        h("footer", { class: "foot" }, this.status)),
      this.details.element, this.uploads.element, messages(), this.files, this.directories);
  }

  start() {
    this.go();
    this.refreshSidebar();
    listen((message) => this.heard(message));
  }

  // Before it is taken out of the window, which forgets how far a list was scrolled.
  pause() {
    this.scrolled = this.view.element.scrollTop;
  }

  // With another session, where one was.
  goOn() {
    this.view.element.scrollTop = this.scrolled;
    this.showPlace();
    listen((message) => this.heard(message));
    this.heard({ state: "connected" });
    this.refresh();
  }

  // -- Where one is

  async go() {
    const { place, identifier } = placeInAddress();
    this.sidebar.element.classList.remove("open");
    const known = this.listing?.byID.get(identifier);
    if (place || known?.isFolder && !known.isTrashed) {
      this.show(place ?? new Place("folder", identifier));
      return;
    }
    const { hash } = location;
    const asked = new Listing(new Place("folder", identifier));
    this.use(asked);
    try {
      const item = await this.waitingFor(asked, itemOf(identifier));
      if (location.hash !== hash) {
        return;  // somebody has gone on
      }
      if (item.isFolder && !item.isTrashed) {
        this.show(new Place("folder", item.itemIdentifier));
      } else {
        await this.show(item.isTrashed ? new Place("trash")
          : new Place("folder", item.parentItemIdentifier));
        this.view.choose(item.itemIdentifier);
      }
    } catch (error) {
      asked.fail(error);
      this.showState();
    }
  }

  show(place) {
    if (this.listing?.place.key === place.key && this.listing.state === "ready") {
      return Promise.resolve();
    }
    const listing = new Listing(place);
    this.use(listing);
    return this.waitingFor(listing, listing.load()).finally(() => {
      if (this.listing === listing) {
        this.showPlace();
        this.showState();
        this.focusIfLost();
      }
    });
  }

  // Says why when an answer takes long: the service answers at once, but for the documents
  // themselves while it compares what it knows of them with the disk.
  async waitingFor(listing, answer) {
    const slow = setTimeout(async () => {
      const isThere = await isAnswering(SLOW);
      if (this.listing === listing && isWaiting) {
        this.slowness = isThere ? "checking" : "unanswered";
        this.showState();
      }
    }, SLOW);
    let isWaiting = true;
    try {
      return await answer;
    } finally {
      isWaiting = false;
      clearTimeout(slow);
      if (this.listing === listing && this.slowness) {
        this.slowness = null;
        this.showState();
      }
    }
  }

  use(listing) {
    this.slowness = null;
    // Not when the page opens: nobody has moved yet, and a frame around the first item looks odd.
    const hadFocus = this.listing !== null &&
      (this.view.element.contains(document.activeElement) || document.activeElement === document.body);
    this.listing?.close();
    this.listing = listing;
    this.closeFilter();
    this.wantsFocus = hadFocus;
    listing.addEventListener("change", (event) => {
      this.showState();
      if (event.detail.isRenamed || listing.folder !== this.shownFolder) {
        this.showPlace();
      }
    });
    this.view.show(listing);
    this.showPlace();
    this.showState();
  }

  focusIfLost() {
    if (this.wantsFocus && document.activeElement === document.body) {
      this.view.element.focus();
    }
  }

  get folder() {
    return this.listing?.folder ?? null;
  }

  get title() {
    const { kind, value } = this.listing.place;
    switch (kind) {
      case "folder": return value === ROOT ? t("documents") : shownName(this.folder?.filename ?? "");
      case "tagged": return t("taggedWith", { tag: shownName(value) });
      case "search": return t("searchResults", { words: value });
      default: return t(kind);
    }
  }

  showPlace() {
    const { kind, value, key } = this.listing.place;
    this.shownFolder = this.folder;
    document.title = this.title === "" ? "Marrowdale" : `${this.title} – Marrowdale`;
    this.view.element.setAttribute("aria-label", this.title || t("content"));
    this.heading.textContent = this.title || t("content");
    this.sidebar.show(key);
    if (kind !== "search" && document.activeElement !== this.search) {
      this.search.value = "";
    } else if (kind === "search" && document.activeElement !== this.search) {
      this.search.value = value;
    }
    this.showCrumbs();
    this.showRefusal();
  }

  async showCrumbs() {
    const listing = this.listing;
    const crumb = (name, address, isLast) => h("li", {},
      isLast ? h("span", { "aria-current": "page" }, h("bdi", {}, name))
        : this.crumbLink(name, address));
    if (listing.place.kind !== "folder" || !this.folder) {
      this.crumbs.replaceChildren(h("ol", {}, crumb(this.title || t("loading"), "", true)));
      return;
    }
    let path;
    try {
      path = await trailOf(this.folder);
    } catch {
      return;  // gone meanwhile, which the listing tells
    }
    if (this.listing === listing) {
      this.crumbs.replaceChildren(h("ol", {}, path.map((item, index) => crumb(
        item.itemIdentifier === ROOT ? t("documents") : shownName(item.filename),
        item.itemIdentifier, index === path.length - 1))));
    }
  }

  crumbLink(name, identifier) {
    const place = `folder/${identifier}`;
    const link = h("a", { href: addressOfItem(identifier),
                          ondragover: (event) => {
                            if (this.isDropTargetPlace(place)) {
                              event.preventDefault();
                              link.classList.add("drop");
                            }
                          },
                          ondragleave: () => link.classList.remove("drop"),
                          ondrop: (event) => {
                            event.preventDefault();
                            link.classList.remove("drop");
                            this.droppedOnPlace(place, event);
                          } }, h("bdi", {}, name));
    return link;
  }

  // -- What may be put here

  // Why nothing new can be put here; empty where it can.
  get refusalText() {
    const { kind, value } = this.listing.place;
    if (kind !== "folder") {
      return t("refusedHere");
    }
    if (!this.folder || this.folder.capabilities & CAN.write) {
      return "";
    }
    return t(value === ROOT ? "refusedTop" : "refusedHere");
  }

  showRefusal() {
    const text = this.refusalText;
    const isTop = this.listing.place.value === ROOT && this.listing.place.kind === "folder";
    for (const each of [this.folderButton, this.uploadButton]) {
      each.setAttribute("aria-disabled", text !== "");
      if (text) {
        each.title = text;
      } else {
        each.title = each === this.folderButton ? t("newFolder") : t("upload");
      }
    }
    // Where there is nothing at all, what is shown in its place says what to do.
    this.refusal.hidden = !isTop || this.listing.state === "ready" && this.listing.items.length === 0;
    this.refusal.replaceChildren(icon("info"), h("span", {}, t("refusedTop")));
  }

  async newFolder() {
    if (this.refusalText) {
      this.explainRefusal();
      return;
    }
    const made = await this.actions.newFolder(this.folder);
    const item = made && this.listing.byID.get(made.itemIdentifier);
    if (item) {
      this.view.choose(item.itemIdentifier);
      this.view.beginRename(item);
    }
  }

  async explainRefusal() {
    const answer = await explain(t("refusedTitle"), this.refusalText, [t("choose"), "choose"]);
    if (answer === "choose") {
      const folder = await chooseFolder(t("chooseTitle"), t("chooseHere"));
      if (folder) {
        location.hash = addressOfItem(folder.itemIdentifier);
      }
    }
  }

  uploadWanted() {
    if (this.refusalText) {
      this.explainRefusal();
      return;
    }
    menuBelow(this.uploadButton, [
      { label: t("uploadFiles"), icon: "file", act: () => this.files.click() },
      { label: t("uploadFolder"), icon: "folder", act: () => this.directories.click() }]);
  }

  async filesChosen(field) {
    const files = [...field.files];
    field.value = "";
    await this.uploads.addFiles(files, this.folder).catch(tellError);
  }

  // -- What is shown

  showState() {
    const { listing } = this;
    this.view.element.hidden = listing.state === "gone" || listing.state === "error";
    const content = this.stateContent();
    this.state.hidden = content === null;
    this.showRefusal();
    this.state.replaceChildren(...(content ?? []));
    this.main.setAttribute("aria-busy", listing.state === "loading");
    this.showStatus();
  }

  stateContent() {
    const { listing } = this;
    const told = (picture, title, hint, ...more) => [icon(picture), h("h2", {}, title),
                                                     hint ? h("p", {}, hint) : null, ...more]
      .filter(Boolean);
    if (listing.state === "error") {
      return told("alert", t("errorTitle"), listing.error.message,
                  button(t("retry"), null, () => this.again(), { text: true }));
    }
    if (listing.state === "gone") {
      return told("folder", t("goneTitle"), t("goneHint"),
                  h("a", { href: "#/", class: "button" }, t("documents")));
    }
    if (listing.items.length > 0) {
      return null;
    }
    if (listing.filter !== "" && listing.all.length > 0) {
      return told("filter", t("emptyFilter"), "",
                  button(t("showAll"), null, () => this.closeFilter(), { text: true }));
    }
    if (listing.state === "loading") {
      return this.slowness ? told("clock", t(this.slowness), t(`${this.slowness}Hint`))
        : [h("p", { class: "hint" }, t("loading"))];
    }
    return this.emptyContent(told);
  }

  emptyContent(told) {
    const { kind, value } = this.listing.place;
    const capital = kind.charAt(0).toUpperCase() + kind.slice(1);
    switch (kind) {
      case "folder":
        return value === ROOT
          ? told("documents", t("emptyRoot"),
                 t("emptyRootHint", { path: shownName(this.folder?.path ?? "") }))
          : told("folder", t("emptyFolder"), this.refusalText ? "" : t("emptyFolderHint"));
      case "trash": return told("trash", t("emptyTrashTitle"), t("emptyTrashHint"));
      case "search": return told("search", t("emptySearch"), t("emptySearchHint"));
      case "tagged": return told("tag", t("emptyTag"), t("emptyTagHint"));
      default: return told(kind === "recents" ? "clock" : "star", t(`empty${capital}`),
                           t(`empty${capital}Hint`));
    }
  }

  again() {
    const { place } = this.listing;
    this.listing.close();
    this.listing = null;
    this.show(place);
    this.view.element.focus();
  }

  showStatus() {
    const { listing } = this;
    const total = listing.items.length;
    const selected = this.view.selected.size;
    const counted = listing.filter !== ""
      ? t("filteredCount", { n: shownCount(total), total: shownCount(listing.all.length) })
      : total === 1 ? t("oneItem") : t("itemCount", { n: shownCount(total) });
    this.status.textContent = this.slowness && total > 0 ? t(this.slowness)
      : listing.state === "loading"
      ? (total > 0 ? t("loadedSoFar", { n: shownCount(total) }) : t("loading"))
      : selected > 0 ? t("selectedCount", { n: shownCount(selected), total: shownCount(total) })
      : counted;
  }

  selectionChanged() {
    if (this.listing) {
      this.showStatus();
      this.details.show(this.view.selection);
    }
  }

  tellOrder() {
    const { key, descending } = this.listing.order;
    this.status.textContent = t("sortedBy", { key: t(key),
                                              order: t(descending ? "descending" : "ascending") });
  }

  toggleMode() {
    this.view.setMode(this.view.mode === "list" ? "grid" : "list");
    this.showMode();
  }

  showMode() {
    const other = this.view.mode === "list" ? "grid" : "list";
    const label = t(other === "grid" ? "asGrid" : "asList");
    this.modeButton.replaceChildren(icon(other));
    this.modeButton.setAttribute("aria-label", label);
    this.modeButton.title = label;
  }

  // -- News

  heard({ state, signal }) {
    if (state === "lost") {
      this.wasLost = true;
      this.banner.hidden = false;
      this.banner.replaceChildren(icon("alert"), h("span", {}, t("lost")));
    } else if (state === "connected" && this.wasLost) {
      this.wasLost = false;
      this.banner.hidden = true;
      tell(t("found"));
      this.refresh();
    } else if (signal) {
      this.refresh();
    }
  }

  refresh() {
    this.refreshSidebarSoon();
    return this.listing && this.waitingFor(this.listing, this.listing.refresh());
  }

  refreshSidebarSoon() {
    this.sidebarTimer ??= setTimeout(() => {
      this.sidebarTimer = undefined;
      this.refreshSidebar();
    }, SEARCH_PAUSE);
  }

  refreshSidebar() {
    this.sidebar.refresh().catch(() => {
      // Whatever it is, the content or the banner tells it.
    });
  }

  // -- Filter

  toggleFilter() {
    if (this.filterBar.hidden) {
      this.openFilter();
    } else {
      this.closeFilter();
    }
  }

  openFilter() {
    this.filterBar.hidden = false;
    this.filterButton.setAttribute("aria-expanded", "true");
    this.filter.focus();
  }

  closeFilter() {
    const hadFocus = this.filterBar.contains(document.activeElement);
    this.filterBar.hidden = true;
    this.filterButton.setAttribute("aria-expanded", "false");
    this.filter.value = "";
    if (this.listing?.filter) {
      this.listing.setFilter("");
    }
    if (hadFocus) {
      this.view.element.focus();
    }
  }

  filterTyped() {
    this.listing.setFilter(this.filter.value);
  }

  filterKey(event) {
    if (event.key === "Escape") {
      this.closeFilter();
      event.preventDefault();
    } else if (event.key === "ArrowDown" || event.key === "Enter") {
      this.view.element.focus();
      event.preventDefault();
    }
  }

  // -- Search

  searchTyped() {
    clearTimeout(this.searching);
    this.searching = setTimeout(() => {
      const words = this.search.value.trim();
      if (words === "") {
        if (this.listing.place.kind === "search") {
          location.hash = this.beforeSearch ?? "#/";
        }
        return;
      }
      const address = `#/search/${encodeURIComponent(words)}`;
      if (this.listing.place.kind === "search") {
        history.replaceState(null, "", address);
        this.go();
      } else {
        this.beforeSearch = location.hash;
        location.hash = address;
      }
    }, SEARCH_PAUSE);
  }

  searchKey(event) {
    if (event.key === "Escape") {
      this.search.value = "";
      this.searchTyped();
      this.view.element.focus();
      event.preventDefault();
    } else if (event.key === "ArrowDown" || event.key === "Enter") {
      this.view.element.focus();
      event.preventDefault();
    }
  }

  // -- What the view asks for

  open(item) {
    if (item.isFolder && !item.isTrashed) {
      location.hash = addressOfItem(item.itemIdentifier);
      return;
    }
    if (!item.isTrashed) {
      this.actions.used(item);
    }
    if (isPreviewed(item) || item.isTrashed) {
      this.preview(item);
    } else {
      this.actions.download([item]);
    }
  }

  preview(item = this.listing.byID.get(this.view.current)) {
    if (!item) {
      return;
    }
    const { items } = this.listing;
    preview(items, items.indexOf(item), {
      moved: (other) => this.view.choose(other.itemIdentifier),
      download: (other) => this.actions.download([other]) });
  }

  rename(item, name) {
    return this.actions.rename(item, name);
  }

  menu(x, y) {
    menu(this.entries(), x, y);
  }

  entries() {
    const items = this.view.selection;
    return items.length === 0 ? this.placeEntries() : items[0].isTrashed ? this.trashedEntries(items)
      : this.itemEntries(items);
  }

  placeEntries() {
    const reason = this.refusalText;
    const isTrash = this.listing.place.kind === "trash";
    return [
      { label: t("newFolder"), icon: "newFolder", reason, act: () => this.newFolder() },
      { label: t("uploadFiles"), icon: "upload", reason, act: () => this.files.click() },
      { label: t("uploadFolder"), icon: "newFolder", reason, act: () => this.directories.click() },
      null,
      { label: t("selectAll"), icon: "check", keys: t("keyAll"), act: () => this.view.selectAll() },
      isTrash ? { label: t("emptyTrash"), icon: "trash", act: () => this.actions.emptyTrash() }
        : undefined].filter((entry) => entry !== undefined);
  }

  itemEntries(items) {
    const [item] = items;
    const isOne = items.length === 1;
    const unless = (capability) => allow(items, capability) ? "" : t("refusedItem");
    const isFavorite = items.every((each) => each.favoriteRank !== undefined);
    const some = [
      isOne ? { label: t("open"), icon: "chevron", keys: "Enter", act: () => this.open(item) } : undefined,
      isOne && isPreviewed(item) ? { label: t("preview"), icon: "image", keys: t("keySpace"),
                                     act: () => this.preview(item) } : undefined,
      { label: t(needsArchive(items) ? "downloadArchive" : "download"), icon: "download",
        act: () => this.actions.download(items, this.title) },
      null,
      isOne ? { label: t("rename"), icon: "pencil", keys: "F2", reason: unless(CAN.rename),
                act: () => this.view.beginRename(item) } : undefined,
      { label: t("moveTo"), icon: "folder", reason: unless(CAN.move),
        act: () => this.actions.chooseAndMove(items) },
      { label: t("editTags"), icon: "tag", act: () => this.actions.editTags(items) },
      { label: t(isFavorite ? "removeFavorite" : "addFavorite"), icon: "star",
        act: () => this.actions.setFavorite(items, !isFavorite) },
      isOne ? { label: t("copyAddress"), icon: "link", act: () => this.actions.copyAddress(item) } : undefined,
      null,
      { label: t("moveToTrash"), icon: "trash", keys: t("keyDelete"), reason: unless(CAN.trash),
        act: () => this.actions.trash(items) }];
    return some.filter((entry) => entry !== undefined);
  }

  trashedEntries(items) {
    return [
      { label: t("putBack"), icon: "undo", act: () => this.actions.putBack(items) },
      { label: t("moveTo"), icon: "folder", act: () => this.actions.chooseAndMove(items) },
      null,
      { label: t("deleteForGood"), icon: "close", keys: t("keyDelete"), act: () => this.actions.deleteForGood(items) },
      { label: t("emptyTrash"), icon: "trash", act: () => this.actions.emptyTrash() }];
  }

  moreMenu(element) {
    const sorts = ["name", "modified", "size", "kind"].map((key) => ({
      label: `${t("sortBy")}: ${t(key)}`,
      icon: this.listing.order.key === key ? "check" : undefined,
      act: () => { this.view.sortBy(key); this.view.element.focus(); } }));
    menuBelow(element, [...this.entries(), null, ...sorts, null,
      { label: t("newWindow"), icon: "screens", act: () => this.otherBrowser() },
      { label: t("sessions"), icon: "menu", act: () => this.showSessions() }]);
  }

  async otherBrowser() {
    try {
      const { address } = await post("/v1/launches", {});
      await dialog(t("newWindowTitle"), () => [h("p", {}, t("newWindowText")),
        h("input", { readonly: true, value: address, "aria-label": t("newWindowTitle"),
                     class: "address", autofocus: true })]);
    } catch (error) {
      tellError(error);
    }
  }

  async showSessions() {
    const { sessions } = await get("/v1/sessions");
    await dialog(t("sessionsTitle"), (close) => [h("ul", { class: "sessions" },
      sessions.map(({ number, client, begun, isThis }) => h("li", {},
        h("div", {}, h("span", { title: shownName(client) }, shownClient(client)),
          h("span", { class: "hint" }, t("since", { date: fullDate(begun) }) +
            (isThis ? ` · ${t("thisSession")}` : ""))),
        button(t("endSession"), null, async () => {
          await remove(`/v1/sessions/${number}`).catch(tellError);
          tell(t("sessionEnded"));
          close();
        }, { text: true })))), buttons(button(t("ok"), null, () => close(),
                                              { text: true, kind: "primary", autofocus: true }))],
                 { wide: true });
  }

  // -- Dragging

  dragged(event) {
    const items = this.view.selection;
    this.draggedItems = items;
    event.dataTransfer.setData(DRAGGED, "");
    event.dataTransfer.effectAllowed = "move";
    const badge = h("div", { class: "drag-badge" }, items.length === 1
      ? shownName(items[0].filename) : t("dragging", { n: items.length }));
    document.body.append(badge);
    event.dataTransfer.setDragImage(badge, 12, 12);
    setTimeout(() => badge.remove());
  }

  carriesItems(event) {
    return event.dataTransfer.types.includes(DRAGGED);
  }

  carriesFiles(event) {
    return event.dataTransfer.types.includes("Files");
  }

  isDropTarget(item, event) {
    const isItself = this.carriesItems(event) &&
      this.draggedItems?.some((each) => each.itemIdentifier === item.itemIdentifier);
    return item.isFolder && !item.isTrashed && !isItself && Boolean(item.capabilities & CAN.write) &&
      (this.carriesItems(event) || this.carriesFiles(event));
  }

  dropped(item, event) {
    if (this.carriesFiles(event)) {
      this.uploads.addDropped(event.dataTransfer, item).catch(tellError);
    } else {
      this.actions.moveInto(this.draggedItems ?? [], item);
    }
  }

  isDropTargetPlace(place) {
    return place !== "recents/" && place !== this.listing.place.key;
  }

  async droppedOnPlace(place, event) {
    const [kind, value] = [place.slice(0, place.indexOf("/")), place.slice(place.indexOf("/") + 1)];
    if (this.carriesFiles(event)) {
      if (kind === "folder") {
        const dropped = Uploads.take(event.dataTransfer);
        const folder = await itemOf(value);
        if (folder.capabilities & CAN.write) {
          await this.uploads.addTaken(dropped, folder).catch(tellError);
        } else {
          explain(t("refusedTitle"), t(value === ROOT ? "refusedTop" : "refusedHere"));
        }
      }
      return;
    }
    const items = this.draggedItems ?? [];
    if (kind === "trash") {
      await this.actions.trash(items);
    } else if (kind === "favorites") {
      await this.actions.setFavorite(items, true);
    } else if (kind === "tagged") {
      for (const item of items) {
        await this.tagWith(item, value);
      }
      this.refresh();
    } else if (kind === "folder") {
      await this.actions.moveInto(items, await itemOf(value));
    }
  }

  tagWith(item, tag) {
    return act({ action: "tag", item: item.itemIdentifier,
                 tags: [...new Set([...(item.tags ?? []), tag])] }).catch(tellError);
  }

  draggedOver(event) {
    if (this.carriesFiles(event)) {
      event.preventDefault();
      event.dataTransfer.dropEffect = this.refusalText ? "none" : "copy";
      this.main.classList.toggle("drop", !this.refusalText);
    }
  }

  droppedHere(event) {
    this.main.classList.remove("drop");
    if (!this.carriesFiles(event)) {
      return;
    }
    event.preventDefault();
    if (this.refusalText) {
      this.explainRefusal();
    } else {
      this.uploads.addDropped(event.dataTransfer, this.folder).catch(tellError);
    }
  }

  // -- Keys

  pressed(event) {
    if (event.target.closest("input, textarea, dialog, .menu, audio, video")) {
      return;
    }
    const items = this.view.selection;
    const isInView = event.target === this.view.element;
    const key = `${event.ctrlKey || event.metaKey ? "Ctrl+" : ""}${event.altKey ? "Alt+" : ""}` +
      `${event.shiftKey ? "Shift+" : ""}${event.key}`;
    const current = this.listing?.byID.get(this.view.current);
    const done = {
      "/": () => this.search.focus(),
      "Ctrl+f": () => this.search.focus(),
      "Ctrl+i": () => this.openFilter(),
      "Ctrl+a": () => this.view.selectAll(),
      "Ctrl+z": () => this.actions.undo?.(),
      "Ctrl+Shift+N": () => this.newFolder(),
      "Alt+Shift+N": () => this.newFolder(),
      "Alt+n": () => this.newFolder(),
      "Alt+ArrowUp": () => this.goUp(),
      Backspace: () => this.goUp(),
      Delete: () => this.removeSelected(items),
      F2: () => items.length === 1 && allow(items, CAN.rename) && this.view.beginRename(items[0]),
      "Alt+ArrowDown": isInView && (() => current && this.open(current)),
      Enter: isInView && (() => current && this.open(current)),
      Escape: isInView && (() => { this.view.selected.clear(); this.view.selectionChanged(); }),
    }[key];
    if (done) {
      event.preventDefault();
      done();
    } else if (event.target === document.body && /^(Arrow|Page|Home|End)/.test(event.key)) {
      event.preventDefault();
      this.view.element.focus();
    }
  }

  goUp() {
    if (this.listing.place.kind === "folder" && this.listing.place.value !== ROOT && this.folder) {
      location.hash = addressOfItem(this.folder.parentItemIdentifier);
    }
  }

  removeSelected(items) {
    if (items.length === 0) {
      return;
    }
    if (items[0].isTrashed) {
      this.actions.deleteForGood(items);
    } else if (allow(items, CAN.trash)) {
      this.actions.trash(items);
    } else {
      explain(t("refusedTitle"), t("refusedItem"));
    }
  }
}

// Without a session the page waits, as it is, for another window of this web browser to begin one.
class Window {
  constructor(root) {
    this.root = root;
    this.page = null;
    this.hidden = null;  // what the page shows, while it waits
    whenSessionEnds(() => this.end());
    whenSessionBegins(() => this.goOn());
  }

  async start() {
    if (await begin()) {
      this.showPage();
    } else {
      this.end();
    }
  }

  showPage() {
    this.page = new Page(this.root);
    this.page.start();
  }

  end() {
    if (this.hidden) {
      return;
    }
    document.querySelectorAll("dialog").forEach((dialog) => dialog.close());
    this.page?.pause();
    this.hidden = [...this.root.childNodes];
    this.root.replaceChildren(h("main", { class: "ended" },
      h("img", { src: "/assets/icon.svg", alt: "", width: "56", height: "56" }),
      h("h1", {}, t("endedTitle")), h("p", {}, t("endedHint")),
      h("code", {}, "marrowdale browse"), h("p", {}, t("endedMore"))));
    document.title = "Marrowdale";
    this.goOn();  // where another window was quicker
  }

  async goOn() {
    if (!this.hidden || !await takeUp()) {
      return;
    }
    const shown = this.hidden;
    this.hidden = null;
    if (this.page) {
      this.root.replaceChildren(...shown);
      this.page.goOn();
    } else {
      this.showPage();
    }
  }
}

new Window(document.getElementById("app")).start();
