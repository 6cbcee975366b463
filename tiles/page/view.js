"use strict";

const byId = (id) => document.getElementById(id);
const form = byId("adjustments");
let current = -1;
let picture = null;
let selection = null;
// Counts what makes tiles look otherwise: adjustments, and parts that have come to be there.
let version = 0;

const viewer = makeViewer("viewer", "openseadragon/images/");
let scaleBar = null;

function adjustments() {
  const query = new URLSearchParams();
  for (const input of form.querySelectorAll("input")) {
    const changed = input.type === "checkbox" ? input.checked : input.value !== input.defaultValue;
    if (changed && input.name !== "radius") query.set(input.name, input.value);
  }
  if (query.has("amount")) query.set("radius", form.radius.value);
  return query;
}

function say(text) {
  byId("message").textContent = text;
  byId("message").hidden = !text;
}

function tileSource() {
  return {
    width: picture.width,
    height: picture.height,
    tileSize: picture.tile,
    minLevel: 0,
    maxLevel: picture.levels - 1,
    getTileUrl: (level, x, y) => {
      const query = adjustments();
      query.set("v", version);
      return `pictures/${current}/tile/${level}/${x}/${y}?${query}`;
    },
  };
}

// Tiles that are shown stay until the new ones are there.
function showAnew() {
  ++version;
  const old = viewer.world.getItemAt(0);
  if (!old) return;
  viewer.addTiledImage({
    tileSource: tileSource(),
    success: ({ item }) => {
      const remove = () => {
        if (viewer.world.getIndexOfItem(old) >= 0 && viewer.world.getItemCount() > 1) viewer.world.removeItem(old);
      };
      item.addOnceHandler("fully-loaded-change", remove);
      setTimeout(remove, 3000);
    },
  });
}

async function showCommand() {
  const query = adjustments();
  if (selection) for (const [key, value] of Object.entries(selection)) query.set(key, value);
  const answer = await fetch(`pictures/${current}/command?${query}`);
  const text = await answer.text();
  byId("command").value = text;
  byId("command").hidden = !text;
  byId("save").hidden = !selection;
  if (selection) byId("save").href = `pictures/${current}/part?${query}`;
  if (!answer.ok) say(text);
}

function showValues() {
  for (const input of form.querySelectorAll("input[type=range]"))
    input.parentElement.querySelector("output").value = input.value;
}

async function watch(number) {
  for (let shown = 0, when = Date.now(); number === current;) {
    const answer = await fetch(`pictures/${number}/state`);
    if (!answer.ok || number !== current) return;
    const { rows, done, failed } = await answer.json();
    byId("progress").hidden = done;
    byId("progress").value = rows / picture.height;
    if (failed) say(failed);
    if (done) {
      if (watch.waited) showAnew();
      return;
    }
    watch.waited = true;
    // Now and then what has come to be there is shown.
    if (rows > shown && Date.now() - when > 1500) {
      shown = rows;
      when = Date.now();
      showAnew();
    }
    await new Promise((resolve) => setTimeout(resolve, 300));
  }
}

async function show(number) {
  current = number;
  picture = null;
  select(null);
  watch.waited = false;
  byId("name").textContent = names[number];
  byId("about").textContent = "";
  byId("pixel").textContent = "\u00a0";
  byId("progress").hidden = true;
  for (const button of byId("strip").children)
    button.setAttribute("aria-current", String(Number(button.dataset.number) === number));
  viewer.close();
  const answer = await fetch(`pictures/${number}`);
  if (number !== current) return;
  if (!answer.ok) {
    say(await answer.text());
    return;
  }
  say("");
  picture = await answer.json();
  byId("about").textContent =
    `${picture.width} \u00d7 ${picture.height}, ${picture.colours}${picture.alpha ? " with alpha" : ""}`;
  form.level.disabled = picture.colours !== "rgb";
  for (const name of ["gamma", "gain", "bias"]) form[name].disabled = picture.colours === "cmyk";
  if (form.level.disabled) form.level.checked = false;
  if (scaleBar) viewer.removeControl(scaleBar);
  scaleBar = null;
  viewer.addOnceHandler("open", () => {
    if (picture.perMetre > 0) scaleBar = addScaleBar(viewer, picture.width, picture.perMetre);
  });
  viewer.open(tileSource());
  watch(number);
  showCommand();
}

form.addEventListener("input", () => {
  showValues();
  clearTimeout(form.timer);
  form.timer = setTimeout(() => {
    showAnew();
    showCommand();
  }, 120);
});
form.addEventListener("reset", () => setTimeout(() => form.dispatchEvent(new Event("input"))));
form.addEventListener("submit", (event) => event.preventDefault());

// The pixel of the picture under a place in the viewer.
function pixelAt(position) {
  const item = viewer.world.getItemAt(0);
  if (!item || !picture) return null;
  const point = item.viewerElementToImageCoordinates(position);
  return { x: Math.floor(point.x), y: Math.floor(point.y) };
}

let asking = false;
let next = null;
async function showPixel(at) {
  next = at;
  if (asking || !next) return;
  asking = true;
  while (next) {
    const { x, y } = next;
    next = null;
    if (!picture || x < 0 || y < 0 || x >= picture.width || y >= picture.height) continue;
    const answer = await fetch(`pictures/${current}/pixel?x=${x}&y=${y}`);
    if (answer.ok) {
      const { samples, rough } = await answer.json();
      byId("pixel").textContent = `${x}, ${y}: ${rough ? "about " : ""}${samples.join(" ")}`;
    }
  }
  asking = false;
}

function select(rectangle) {
  selection = rectangle;
  viewer.removeOverlay("selection");
  byId("selection")?.remove();
  if (!rectangle) return;
  const box = document.createElement("div");
  box.id = "selection";
  box.className = "selection";
  const { x, y, width, height } = rectangle;
  viewer.addOverlay({ element: box, location: viewer.world.getItemAt(0).imageToViewportRectangle(x, y, width, height) });
}

let from = null;
function selecting() {
  return byId("select").getAttribute("aria-pressed") === "true";
}
function dragTo(position) {
  const to = pixelAt(position);
  if (!from || !to) return;
  const inside = (value, most) => Math.min(Math.max(value, 0), most - 1);
  const [left, right] = [inside(from.x, picture.width), inside(to.x, picture.width)].sort((a, b) => a - b);
  const [top, bottom] = [inside(from.y, picture.height), inside(to.y, picture.height)].sort((a, b) => a - b);
  select({ x: left, y: top, width: right - left + 1, height: bottom - top + 1 });
}
viewer.addHandler("canvas-press", (event) => {
  if (selecting()) from = pixelAt(event.position);
});
viewer.addHandler("canvas-drag", (event) => {
  if (!selecting()) return;
  event.preventDefaultAction = true;
  dragTo(event.position);
});
viewer.addHandler("canvas-drag-end", (event) => {
  if (!selecting()) return;
  event.preventDefaultAction = true;
  dragTo(event.position);
  byId("select").setAttribute("aria-pressed", "false");
  showCommand();
});
byId("select").addEventListener("click", () => {
  const on = !selecting();
  byId("select").setAttribute("aria-pressed", String(on));
  if (on) {
    select(null);
    showCommand();
  }
});
new OpenSeadragon.MouseTracker({
  element: viewer.canvas,
  moveHandler: (event) => showPixel(pixelAt(event.position)),
});

let names = [];
async function start() {
  names = await (await fetch("pictures")).json();
  byId("strip").hidden = names.length < 2;
  names.forEach((name, number) => {
    const button = document.createElement("button");
    button.dataset.number = number;
    button.title = name;
    const image = document.createElement("img");
    image.alt = "";
    image.loading = "lazy";
    if (names.length > 1) image.src = `pictures/${number}/thumbnail`;
    const label = document.createElement("span");
    label.textContent = name;
    button.append(image, label);
    button.addEventListener("click", () => show(number));
    byId("strip").append(button);
  });
  showValues();
  show(0);
}
start();
