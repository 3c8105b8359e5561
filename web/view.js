// Shows a listing as rows or tiles, of which only those in sight are there; keeps selection, the
// current item and the scroll position by items, whatever changes underneath.

import { h, icon } from "./dom.js";
import { fullDate, kindOf, shownDate, shownName, shownSize } from "./format.js";
import { pictureOf } from "./pictures.js";
import { shownFolder } from "./places.js";
import { t } from "./text.js";

const ROW_HEIGHT = 38;
const TILE_WIDTH = 152;
const TILE_HEIGHT = 172;
const TILE_PICTURE = { width: 128, height: 88 };
const BEYOND = 6;  // rows above and below that are made, too

const COLUMNS = ["name", "modified", "size", "kind"];

function elementID(item) {
  return "item-" + item.itemIdentifier.replace(/[^A-Za-z0-9]/g, "_");
}

export class View extends EventTarget {
  // `delegate`: open(item), preview(), menu(x, y), dragged(event), isDropTarget(item),
  // dropped(item, event), rename(item, name).
  constructor(delegate) {
    super();
    this.delegate = delegate;
    this.listing = null;
    this.mode = localStorage.getItem("view") === "grid" ? "grid" : "list";
    this.selected = new Set();  // identifiers
    this.current = null;        // identifier of the item that the keyboard is at
    this.pivot = null;          // where a range began
    this.rows = new Map();      // shown ones, by the item that they show
    this.typed = "";
    this.renaming = null;
    this.build();
  }

  build() {
    this.sizer = h("div", { class: "sizer", role: "presentation" });
    this.grid = h("div", { class: "items", role: "group", tabindex: "0",
                           "aria-label": t("content"),
                           onkeydown: (event) => this.pressed(event),
                           onscroll: () => this.render(),
                           onclick: (event) => this.clicked(event),
                           ondblclick: (event) => this.doubleClicked(event),
                           oncontextmenu: (event) => this.menuWanted(event),
                           ondragstart: (event) => this.dragStarted(event),
                           onfocus: () => this.focused() });
    this.header = h("div", { class: "row header", role: "row", "aria-rowindex": "1" },
      COLUMNS.map((key, index) => h("div", { role: "columnheader", class: `cell ${key}`,
                                             "aria-colindex": index + 1 },
        h("button", { type: "button", class: "sort", tabindex: "-1",
                      onclick: () => this.sortBy(key) }, t(key)))));
    this.grid.append(this.header, this.sizer);
    this.element = this.grid;
    new ResizeObserver(() => this.render()).observe(this.grid);
  }

  setMode(mode) {
    this.mode = mode;
    localStorage.setItem("view", mode);
    this.forgetRows();
    this.render();
    this.reveal(this.current);
  }

  show(listing) {
    this.listing?.removeEventListener("change", this.onchange);
    this.listing = listing;
    this.onchange = (event) => this.update(event.detail);
    listing.addEventListener("change", this.onchange);
    this.selected.clear();
    this.current = null;
    this.pivot = null;
    this.forgetRows();
    this.grid.scrollTop = 0;
    this.update({});
  }

  forgetRows() {
    this.rows.forEach((row) => row.remove());
    this.rows.clear();
  }

  get items() {
    return this.listing?.items ?? [];
  }

  get selection() {
    return [...this.selected].map((identifier) => this.listing.byID.get(identifier))
      .filter((item) => item !== undefined);
  }

  get columns() {
    return this.mode === "list" ? 1
      : Math.max(1, Math.floor((this.grid.clientWidth - 16) / TILE_WIDTH));
  }

  get rowHeight() {
    return this.mode === "list" ? ROW_HEIGHT : TILE_HEIGHT;
  }

  get headerHeight() {
    return this.mode === "list" ? this.header.offsetHeight : 0;
  }

  // The listing has changed: what is on top stays on top.
  update({ isReordered = false }) {
    const top = this.topItem;
    const isAtStart = this.grid.scrollTop <= 0;
    for (const identifier of this.selected) {
      if (!this.listing.has(identifier)) {
        this.selected.delete(identifier);
      }
    }
    this.keepCurrent();
    this.render();
    if (isReordered) {
      this.reveal(this.current);
    } else if (!isAtStart && top) {
      this.restoreTop(top);
    }
    this.render();
    this.dispatchEvent(new Event("selection"));
  }

  // The neighbour of an item that is gone is current then.
  keepCurrent() {
    if (this.current && !this.listing.has(this.current)) {
      const at = Math.min(this.currentIndex ?? 0, this.items.length - 1);
      this.current = this.items[at]?.itemIdentifier ?? null;
      this.pivot = this.current;
    }
    if (!this.current && document.activeElement === this.grid) {
      this.current = this.items[0]?.itemIdentifier ?? null;
      this.pivot = this.current;
    }
    this.currentIndex = this.current ? this.listing.indexOf(this.current) : 0;
  }

  get topItem() {
    const row = Math.floor(this.grid.scrollTop / this.rowHeight);
    const item = this.topKnown?.[row * this.columns] ?? null;
    return item && { identifier: item.itemIdentifier,
                     offset: this.grid.scrollTop - row * this.rowHeight };
  }

  restoreTop({ identifier, offset }) {
    const index = this.listing.indexOf(identifier);
    if (index >= 0) {
      this.grid.scrollTop = Math.floor(index / this.columns) * this.rowHeight + offset;
    }
  }

  render() {
    if (!this.listing) {
      return;
    }
    const columns = this.columns;
    const rowCount = Math.ceil(this.items.length / columns);
    this.topKnown = this.items;
    this.header.hidden = this.mode !== "list" || rowCount === 0;
    this.grid.classList.toggle("tiles", this.mode === "grid");
    this.describeGrid(rowCount, columns);
    this.sizer.style.height = `${rowCount * this.rowHeight}px`;
    const first = Math.max(0, Math.floor(this.grid.scrollTop / this.rowHeight) - BEYOND);
    const last = Math.min(rowCount, Math.ceil(
      (this.grid.scrollTop + this.grid.clientHeight) / this.rowHeight) + BEYOND);
    const wanted = new Map();
    for (let row = first; row < last; ++row) {
      const items = this.items.slice(row * columns, (row + 1) * columns);
      const key = this.mode === "list" ? items[0] : `${row}/${columns}`;
      wanted.set(key, { row, items });
    }
    this.keepRenamed(wanted);
    for (const [key, element] of this.rows) {
      if (!wanted.has(key)) {
        element.remove();
        this.rows.delete(key);
      }
    }
    for (const [key, { row, items }] of wanted) {
      this.placeRow(key, row, items);
    }
    this.markCurrent();
    this.markOrder();
  }

  // What has no rows is no grid.
  describeGrid(rowCount, columns) {
    const described = rowCount === 0 ? { role: "group" } : {
      role: "grid", "aria-multiselectable": "true",
      "aria-rowcount": rowCount + (this.mode === "list" ? 1 : 0),
      "aria-colcount": this.mode === "list" ? COLUMNS.length : columns };
    for (const name of ["role", "aria-multiselectable", "aria-rowcount", "aria-colcount"]) {
      if (name in described) {
        this.grid.setAttribute(name, described[name]);
      } else {
        this.grid.removeAttribute(name);
      }
    }
  }

  // A row whose name is being typed stays, even when there is news of its item.
  keepRenamed(wanted) {
    const row = this.renaming?.closest(".row, .tile-row");
    const old = [...this.rows].find(([, element]) => element === row);
    const identifier = this.renaming?.closest("[data-item]")?.dataset.item;
    const now = [...wanted].find(([, { items }]) =>
      items.some((item) => item.itemIdentifier === identifier));
    if (old && now) {
      this.rows.delete(old[0]);
      this.rows.get(now[0])?.remove();
      this.rows.set(now[0], row);
      row.items = now[1].items;
    }
  }

  placeRow(key, row, items) {
    let element = this.rows.get(key);
    if (this.mode === "grid" && element && element.items.some((item, i) => item !== items[i]) ||
        element && element.items.length !== items.length) {
      element.remove();
      element = undefined;
    }
    if (!element) {
      element = this.mode === "list" ? this.makeRow(items[0]) : this.makeTiles(items);
      element.items = items;
      this.rows.set(key, element);
      this.sizer.append(element);
    }
    element.style.transform = `translateY(${row * this.rowHeight}px)`;
    element.setAttribute("aria-rowindex", row + 1 + (this.mode === "list" ? 1 : 0));
    for (const part of this.mode === "list" ? [element] : element.children) {
      const isSelected = this.selected.has(part.dataset.item);
      part.setAttribute("aria-selected", isSelected);
      part.classList.toggle("current", part.dataset.item === this.current);
    }
  }

  makeRow(item) {
    const kind = kindOf(item);
    const cells = [
      h("div", { class: "cell name", role: "gridcell", "aria-colindex": "1" },
        item.isContainer ? pictureOf(item, 18, 18) : icon(kind.icon),
        this.nameOf(item), this.marksOf(item), this.folderOf(item)),
      h("div", { class: "cell modified", role: "gridcell", "aria-colindex": "2",
                 title: fullDate(item.contentModificationDate) },
        shownDate(item.contentModificationDate)),
      h("div", { class: "cell size", role: "gridcell", "aria-colindex": "3" },
        item.isFolder ? "—" : shownSize(item.documentSize)),
      h("div", { class: "cell kind", role: "gridcell", "aria-colindex": "4" }, kind.name)];
    return this.prepared(h("div", { class: "row", role: "row", id: elementID(item) }, cells), item);
  }

  makeTiles(items) {
    return h("div", { class: "tile-row", role: "row" }, items.map((item, index) =>
      this.prepared(h("div", { class: "tile", role: "gridcell", id: elementID(item),
                               "aria-colindex": index + 1 },
        pictureOf(item, TILE_PICTURE.width, TILE_PICTURE.height), this.nameOf(item),
        h("span", { class: "tile-more" }, item.isFolder ? kindOf(item).name
          : shownSize(item.documentSize)), this.marksOf(item)), item)));
  }

  nameOf(item) {
    const shown = shownName(item.filename);
    return h("bdi", { class: "item-name", title: shown }, shown);
  }

  // Beside a name, where what is listed comes from many folders.
  folderOf(item) {
    const { kind } = this.listing.place;
    return kind === "folder" || kind === "trash" || item.isContainer ? null
      : h("bdi", { class: "item-folder" }, shownFolder(item));
  }

  marksOf(item) {
    const marks = (item.tags ?? []).map((tag) => h("span", { class: "tag" },
      h("bdi", {}, shownName(tag))));
    if (item.favoriteRank !== undefined) {
      marks.unshift(h("span", { class: "mark", role: "img", "aria-label": t("favorite") },
        icon("star")));
    }
    return marks.length > 0 ? h("span", { class: "marks" }, marks) : null;
  }

  prepared(element, item) {
    element.dataset.item = item.itemIdentifier;
    element.draggable = true;
    element.classList.toggle("folder", item.isFolder);
    element.addEventListener("dragover", (event) => {
      if (this.delegate.isDropTarget(item, event)) {
        event.preventDefault();
        event.stopPropagation();
        element.classList.add("drop");
      }
    });
    element.addEventListener("dragleave", () => element.classList.remove("drop"));
    element.addEventListener("drop", (event) => {
      element.classList.remove("drop");
      if (this.delegate.isDropTarget(item, event)) {
        event.preventDefault();
        event.stopPropagation();
        this.delegate.dropped(item, event);
      }
    });
    return element;
  }

  markCurrent() {
    const item = this.current && this.listing.byID.get(this.current);
    const id = item ? elementID(item) : null;
    if (id && this.grid.querySelector(`#${id}`)) {
      this.grid.setAttribute("aria-activedescendant", id);
    } else {
      this.grid.removeAttribute("aria-activedescendant");
    }
  }

  markOrder() {
    [...this.header.children].forEach((cell, index) => {
      const isKey = COLUMNS[index] === this.listing.order.key;
      const order = this.listing.order.descending ? "descending" : "ascending";
      if (isKey) {
        cell.setAttribute("aria-sort", order);
      } else {
        cell.removeAttribute("aria-sort");
      }
    });
  }

  sortBy(key) {
    const order = this.listing.order;
    const descending = order.key === key ? !order.descending : key === "modified";
    this.listing.setOrder({ key, descending });
    this.dispatchEvent(new Event("order"));
  }

  reveal(identifier) {
    const index = identifier ? this.listing.indexOf(identifier) : -1;
    if (index < 0) {
      return;
    }
    const top = Math.floor(index / this.columns) * this.rowHeight;
    const bottom = top + this.rowHeight + this.headerHeight;
    if (top < this.grid.scrollTop) {
      this.grid.scrollTop = top;
    } else if (bottom > this.grid.scrollTop + this.grid.clientHeight) {
      this.grid.scrollTop = bottom - this.grid.clientHeight;
    }
  }

  // Selects one item alone, and shows it.
  choose(identifier) {
    this.selected = new Set([identifier]);
    this.current = identifier;
    this.pivot = identifier;
    this.selectionChanged();
  }

  selectionChanged() {
    this.currentIndex = this.current ? this.listing.indexOf(this.current) : 0;
    this.reveal(this.current);
    this.render();
    this.dispatchEvent(new Event("selection"));
  }

  selectAll() {
    this.selected = new Set(this.items.map((item) => item.itemIdentifier));
    this.selectionChanged();
  }

  selectRange(from, to) {
    const low = Math.max(0, Math.min(from, to));
    this.selected = new Set(this.items.slice(low, Math.max(from, to) + 1)
      .map((item) => item.itemIdentifier));
  }

  // What a click or a key does to the selection.
  goTo(index, { range = false, toggle = false, move = false } = {}) {
    const item = this.items[index];
    if (!item) {
      return;
    }
    this.current = item.itemIdentifier;
    if (range) {
      const pivot = this.pivot ? this.listing.indexOf(this.pivot) : index;
      this.selectRange(pivot < 0 ? index : pivot, index);
    } else if (toggle) {
      if (!this.selected.delete(this.current)) {
        this.selected.add(this.current);
      }
      this.pivot = this.current;
    } else if (!move) {
      this.selected = new Set([this.current]);
      this.pivot = this.current;
    }
    this.selectionChanged();
  }

  itemAt(event) {
    const element = event.target.closest("[data-item]");
    return element ? this.listing.byID.get(element.dataset.item) : undefined;
  }

  clicked(event) {
    if (event.target.closest("input, .sort")) {
      return;
    }
    const item = this.itemAt(event);
    if (item) {
      this.goTo(this.listing.indexOf(item.itemIdentifier),
                { range: event.shiftKey, toggle: event.ctrlKey || event.metaKey });
    } else {
      this.selected.clear();
      this.selectionChanged();
    }
  }

  doubleClicked(event) {
    const item = this.itemAt(event);
    if (item && !event.target.closest("input")) {
      this.delegate.open(item);
    }
  }

  menuWanted(event) {
    event.preventDefault();
    const item = this.itemAt(event);
    if (item && !this.selected.has(item.itemIdentifier)) {
      this.choose(item.itemIdentifier);
    }
    let { clientX: x, clientY: y } = event;
    if (x === 0 && y === 0 || event.button !== 2) {
      const box = this.currentElement()?.getBoundingClientRect() ??
        this.grid.getBoundingClientRect();
      [x, y] = [box.left + 48, box.top + Math.min(box.height, 32)];
    }
    this.delegate.menu(x, y);
  }

  currentElement() {
    const item = this.current && this.listing.byID.get(this.current);
    return item ? this.grid.querySelector(`#${elementID(item)}`) : null;
  }

  focused() {
    if (!this.current && this.items.length > 0) {
      this.current = this.items[0].itemIdentifier;
      this.pivot = this.current;
      this.currentIndex = 0;
      this.render();
    }
  }

  dragStarted(event) {
    const item = this.itemAt(event);
    if (!item || this.renaming) {
      event.preventDefault();
      return;
    }
    if (!this.selected.has(item.itemIdentifier)) {
      this.choose(item.itemIdentifier);
    }
    this.delegate.dragged(event);
  }

  pressed(event) {
    if (event.target !== this.grid) {
      return;
    }
    const index = this.current ? this.listing.indexOf(this.current) : -1;
    const columns = this.columns;
    const page = Math.max(1, Math.floor(this.grid.clientHeight / this.rowHeight) - 1) * columns;
    const last = this.items.length - 1;
    const targets = {
      ArrowDown: Math.min(index < 0 ? 0 : index + columns, last), ArrowUp: Math.max(index - columns, 0),
      Home: 0, End: last, PageDown: Math.min(index + page, last),
      PageUp: Math.max(index - page, 0) };
    if (this.mode === "grid") {
      targets.ArrowRight = Math.min(index + 1, last);
      targets.ArrowLeft = Math.max(index - 1, 0);
    }
    if (event.altKey) {
      return;
    }
    if (event.key in targets) {
      event.preventDefault();
      this.goTo(targets[event.key], { range: event.shiftKey, move: event.ctrlKey });
    } else if (event.key === " ") {
      event.preventDefault();
      if (event.ctrlKey || event.shiftKey) {
        this.goTo(index, { toggle: event.ctrlKey, range: event.shiftKey });
      } else if (this.typed !== "") {
        this.typeAhead(" ");
      } else {
        this.delegate.preview();
      }
    } else if (event.key.length === 1 && event.key !== "/" && !event.ctrlKey && !event.metaKey) {
      this.typeAhead(event.key);
    }
  }

  // Goes to the next item whose name begins with what is typed in one go.
  typeAhead(character) {
    clearTimeout(this.typing);
    this.typing = setTimeout(() => { this.typed = ""; }, 800);
    this.typed += character.toLowerCase();
    const start = Math.max(0, this.currentIndex ?? 0) + (this.typed.length === 1 ? 1 : 0);
    const count = this.items.length;
    for (let i = 0; i < count; ++i) {
      const at = (start + i) % count;
      if (this.items[at].filename.toLowerCase().startsWith(this.typed)) {
        this.goTo(at);
        return;
      }
    }
  }

  // The name becomes a field. What is typed survives changes elsewhere.
  beginRename(item) {
    this.choose(item.itemIdentifier);
    const element = this.currentElement();
    const name = element?.querySelector(".item-name");
    if (!name) {
      return;
    }
    const field = h("input", { class: "rename", "aria-label": t("rename"), value: item.filename,
                               spellcheck: "false", autocomplete: "off" });
    const end = async (isWanted) => {
      if (this.renaming !== field) {
        return;
      }
      this.renaming = null;
      const isFocused = document.activeElement === field;
      const wanted = field.value;
      field.replaceWith(name);
      if (isFocused) {
        this.grid.focus();
      }
      if (isWanted && wanted !== "" && wanted !== item.filename) {
        await this.delegate.rename(item, wanted);
      }
    };
    field.addEventListener("keydown", (event) => {
      event.stopPropagation();
      if (event.key === "Enter" || event.key === "Escape") {
        event.preventDefault();
        end(event.key === "Enter");
      }
    });
    field.addEventListener("blur", () => end(true));
    field.addEventListener("dblclick", (event) => event.stopPropagation());
    this.renaming = field;
    name.replaceWith(field);
    field.focus();
    const dot = item.isFolder ? -1 : item.filename.lastIndexOf(".");
    field.setSelectionRange(0, dot > 0 ? dot : item.filename.length);
  }
}
