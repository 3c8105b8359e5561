// The places that one can go to.

import { get, itemPath, ROOT } from "./api.js";
import { h, icon } from "./dom.js";
import { shownCount, shownName, shownSize } from "./format.js";
import { pictureOf } from "./pictures.js";
import { knowPlaces } from "./places.js";
import { t } from "./text.js";

export class Sidebar {
  // `delegate`: isDropTargetPlace(place), droppedOnPlace(place, event).
  constructor(delegate) {
    this.delegate = delegate;
    this.places = h("ul", {});
    this.applications = h("ul", {});
    this.tags = h("ul", {});
    this.applicationsPart = this.part(t("applications"), this.applications);
    this.tagsPart = this.part(t("tags"), this.tags);
    this.space = h("p", { class: "space" });
    this.element = h("nav", { class: "sidebar", "aria-label": t("places") },
      h("div", { class: "brand" }, h("img", { src: "/assets/icon.svg", alt: "", width: "24", height: "24" }),
        h("span", {}, "Marrowdale")),
      this.part(null, this.places), this.applicationsPart, this.tagsPart, this.space);
    this.current = "";
    this.fill(this.places, [
      { place: `folder/${ROOT}`, address: "#/", icon: "documents", name: t("documents") },
      { place: "favorites/", address: "#/favorites", icon: "star", name: t("favorites") },
      { place: "recents/", address: "#/recents", icon: "clock", name: t("recents") },
      { place: "trash/", address: "#/trash", icon: "trash", name: t("trash") }]);
  }

  part(title, list) {
    return h("section", { "aria-label": title ?? t("places") },
      title ? h("h2", {}, title) : null, list);
  }

  // The entries that are there already stay the same elements, so that focus stays.
  fill(list, entries) {
    const known = new Map([...list.children].map((line) => [line.dataset.place, line]));
    const lines = entries.map((entry) => {
      const line = known.get(entry.place) ?? this.line(entry);
      line.querySelector(".place-name").textContent = shownName(entry.name);
      line.querySelector(".count").textContent = entry.count ?? "";
      return line;
    });
    if (lines.length !== list.children.length || lines.some((line, i) => line !== list.children[i])) {
      const focused = document.activeElement;
      list.replaceChildren(...lines);
      if (list.contains(focused)) {
        focused.focus();
      }
    }
    this.mark();
  }

  line({ place, address, icon: name, item }) {
    const link = h("a", { href: address, class: "place",
                          ondragover: (event) => {
                            if (this.delegate.isDropTargetPlace(place)) {
                              event.preventDefault();
                              link.classList.add("drop");
                            }
                          },
                          ondragleave: () => link.classList.remove("drop"),
                          ondrop: (event) => {
                            event.preventDefault();
                            link.classList.remove("drop");
                            this.delegate.droppedOnPlace(place, event);
                          } },
      item ? pictureOf(item, 18, 18) : icon(name), h("bdi", { class: "place-name" }), h("span", { class: "count" }));
    const line = h("li", {}, link);
    line.dataset.place = place;
    return line;
  }

  show(place) {
    this.current = place;
    this.mark();
  }

  mark() {
    for (const line of this.element.querySelectorAll("li")) {
      const link = line.firstElementChild;
      if (line.dataset.place === this.current) {
        link.setAttribute("aria-current", "page");
      } else {
        link.removeAttribute("aria-current");
      }
    }
  }

  async refresh() {
    const [root, first, { tags }, space] = await Promise.all([
      get(itemPath(ROOT)), get(itemPath(ROOT, "/children")), get("/v1/tags"), get("/v1/space")]);
    const applications = first.items.filter((item) => item.isContainer);
    knowPlaces([{ path: root.path, name: t("documents") },
                ...applications.map(({ path, filename }) => ({ path, name: filename }))]);
    this.fill(this.applications, applications.map((item) => ({
      place: `folder/${item.itemIdentifier}`, item, name: item.filename,
      address: `#/item/${encodeURIComponent(item.itemIdentifier)}` })));
    this.fill(this.tags, tags.map(({ tag, items }) => ({
      place: `tagged/${tag}`, icon: "tag", name: tag, count: shownCount(items),
      address: `#/tags/${encodeURIComponent(tag)}` })));
    this.applicationsPart.hidden = applications.length === 0;
    this.tagsPart.hidden = tags.length === 0;
    this.space.textContent = t("free", { size: shownSize(space.available) });
  }
}
