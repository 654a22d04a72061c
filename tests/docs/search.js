// Runs the search of a built site and prints the pages that it finds: node search.js FOLDER QUERY
//
// The site's own scripts do all of it; of a browser there is only what they ask for before they have
// found something.

const fs = require("fs");
const path = require("path");
const vm = require("vm");

const [folder, query] = process.argv.slice(2);
const element = {
  setAttribute() {}, appendChild() {}, classList: { add() {}, remove() {} }, style: {},
  dataset: {}, innerText: "", innerHTML: "",
};
const browser = vm.createContext({
  DOCUMENTATION_OPTIONS: { URL_ROOT: "", BUILDER: "html", FILE_SUFFIX: ".html", LINK_SUFFIX: ".html" },
  document: {
    readyState: "loading", documentElement: { dataset: {} }, body: element,
    addEventListener() {}, getElementById: () => element, querySelector: () => element,
    createElement: () => ({ ...element }), createTextNode: () => ({}), querySelectorAll: () => [],
  },
  window: { location: { search: "", href: "http://localhost/" } },
  localStorage: { setItem() {}, getItem: () => null, removeItem() {} },
  URL, URLSearchParams, console, setTimeout, setInterval: () => 0,
});
browser.window.document = browser.document;

const read = (name) => fs.readFileSync(path.join(folder, name), "utf8");
const run = (name) => vm.runInContext(read(name), browser);
["doctools", "sphinx_highlight", "language_data"].forEach((name) => run(`_static/${name}.js`));

// The results are taken where they would be shown.
const show = "_displayNextItem(results, results.length,";
const parts = read("_static/searchtools.js").split(show);
if (parts.length !== 2) throw new Error("the search shows its results in another way");
vm.runInContext(parts.join(`globalThis.shown = results; (() => 0)(`), browser);
vm.runInContext("Search.title = Search.status = Search.output = Search.dots = " +
  "document.getElementById('search');", browser);
run("searchindex.js");
browser.asked = query;
vm.runInContext("Search.query(asked);", browser);
// The best comes last, to be taken from the end.
console.log(JSON.stringify([...new Set(browser.shown.reverse().map((result) => result[0]))]));
