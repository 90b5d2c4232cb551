// Elements of the page, and tables.

export const element = (id) => document.getElementById(id);

/** A new element with its text or children. */
export function make(name, content = "", className = "") {
  const made = document.createElement(name);
  if (className !== "") {
    made.className = className;
  }
  made.append(...(Array.isArray(content) ? content : [content]));
  return made;
}

export function link(text, address) {
  const made = make("a", text);
  made.href = address;
  return made;
}

export function button(text, onClick, className = "") {
  const made = make("button", text, className);
  made.type = "button";
  made.addEventListener("click", onClick);
  return made;
}

/** A cell is a text, an element, or {text, number, className}. */
function makeCell(name, cell) {
  const isPlain = typeof cell === "string" || cell instanceof Node;
  const made = make(name, isPlain ? cell : cell.text, isPlain ? "" : cell.className ?? "");
  if (!isPlain && cell.number) {
    made.classList.add("number");
  }
  return made;
}

export const figure = (text) => ({ text, number: true });

/** Fills a table with rows of cells. Where there are none, it says so across all columns. */
export function fillTable(table, heads, rows, empty) {
  const head = make("thead");
  const headRow = head.insertRow();
  for (const cell of heads) {
    const made = makeCell("th", cell);
    made.scope = "col";
    headRow.append(made);
  }
  const body = make("tbody");
  for (const row of rows) {
    const line = body.insertRow();
    line.append(...row.map((cell) => makeCell("td", cell)));
  }
  if (rows.length === 0) {
    const cell = body.insertRow().insertCell();
    cell.colSpan = heads.length;
    cell.className = "empty";
    cell.textContent = empty;
  }
  table.replaceChildren(head, body);
}

/** A table that shows a page of its rows at a time, with buttons to turn the pages. */
export class PagedTable {
  #rows = [];
  #heads = [];
  #empty = "";
  #page = 0;

  constructor(place, name, rowsPerPage = 50) {
    this.rowsPerPage = rowsPerPage;
    this.table = make("table");
    this.text = make("span");
    this.text.setAttribute("role", "status");
    this.before = button("Previous page", () => this.#turn(-1));
    this.next = button("Next page", () => this.#turn(1));
    const scroll = make("div", this.table, "scroll");
    scroll.tabIndex = 0;
    scroll.setAttribute("role", "region");
    scroll.setAttribute("aria-label", name);
    place.replaceChildren(make("p", [this.text, this.before, this.next], "pages"), scroll);
  }

  fill(heads, rows, empty) {
    [this.#heads, this.#rows, this.#empty] = [heads, rows, empty];
    this.#turn(0);
  }

  #turn(pages) {
    const last = Math.max(0, Math.ceil(this.#rows.length / this.rowsPerPage) - 1);
    this.#page = Math.min(last, Math.max(0, this.#page + pages));
    const begin = this.#page * this.rowsPerPage;
    fillTable(this.table, this.#heads, this.#rows.slice(begin, begin + this.rowsPerPage), this.#empty);
    this.text.textContent = this.#rows.length === 0 ? this.#empty
      : `Rows ${begin + 1} to ${Math.min(begin + this.rowsPerPage, this.#rows.length)} of ${this.#rows.length.toLocaleString("en-US")}`;
    this.before.hidden = this.next.hidden = last === 0;
    this.before.disabled = this.#page === 0;
    this.next.disabled = this.#page === last;
  }
}

/** Copies a text and says so on the button. Where the browser forbids it, the text is selected instead. */
export async function copy(text, source, said) {
  try {
    await navigator.clipboard.writeText(text);
    said(`Copied: ${text}`);
  } catch {
    if (source) {
      getSelection().selectAllChildren(source);
    }
    said(`Copy this: ${text}`);
  }
}
