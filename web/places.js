// Where things lie, as people say it: from the documents on, or from an application's on.

import { shownName } from "./format.js";

let known = [];  // {path, name}

// The places that documents lie in, each with its folder and its name.
export function knowPlaces(places) {
  known = places.filter(({ path }) => path);
}

// "Documents/Garden/Plan.txt"; in full for what lies elsewhere.
export function shownPlace(path = "") {
  const place = known.find((each) => (path + "/").startsWith(each.path + "/"));
  return shownName(place ? place.name + path.slice(place.path.length) : path);
}

// The folder that an item is in.
export function shownFolder({ path = "" }) {
  return shownPlace(path.slice(0, Math.max(0, path.lastIndexOf("/"))));
}
