// Everything about what is selected.

import { h } from "./dom.js";
import { fullDate, kindOf, shownName, shownSize } from "./format.js";
import { pictureOf } from "./pictures.js";
import { shownPlace } from "./places.js";
import { t } from "./text.js";

export class Details {
  constructor(actions) {
    this.actions = actions;
    this.body = h("div", {});
    this.element = h("aside", { class: "details", "aria-label": t("details") }, this.body);
    this.element.hidden = localStorage.getItem("details") !== "shown";
  }

  toggle() {
    this.element.hidden = !this.element.hidden;
    localStorage.setItem("details", this.element.hidden ? "hidden" : "shown");
  }

  show(items) {
    if (this.element.hidden) {
      return;
    }
    if (items.length !== 1) {
      this.body.replaceChildren(h("p", { class: "hint" }, items.length === 0 ? t("noSelection")
        : t("itemCount", { n: items.length })));
      return;
    }
    const [item] = items;
    const kind = kindOf(item);
    const facts = h("dl", {});
    const fact = (name, value) => {
      if (value) {
        facts.append(h("dt", {}, name), h("dd", {}, h("bdi", {}, value)));
      }
    };
    fact(t("kind"), kind.name);
    fact(t("size"), item.isFolder ? "" : shownSize(item.documentSize));
    fact(t("modified"), fullDate(item.contentModificationDate));
    fact(t("created2"), fullDate(item.creationDate));
    fact(t("lastUsed"), fullDate(item.lastUsedDate));
    fact(t("tags"), (item.tags ?? []).map(shownName).join(", "));
    fact(t("type"), item.isFolder ? "" : item.typeIdentifier);
    fact(t("where"), item.isTrashed ? "" : shownPlace(item.path));
    fact(t("identifier"), item.itemIdentifier);
    this.body.replaceChildren(h("div", { class: "details-icon" }, pictureOf(item, 232, 160)),
      h("h2", {}, h("bdi", {}, shownName(item.filename))), facts);
    if (item.isTrashed) {
      this.showOrigin(item, facts);
    }
  }

  async showOrigin(item, facts) {
    const folder = await this.actions.placeOfOrigin(item).catch(() => null);
    if (folder && facts.isConnected) {
      facts.prepend(h("dt", {}, t("original")), h("dd", {}, h("bdi", {}, shownPlace(folder.path))));
    }
  }
}
