"use strict";

// A pyramid is what Grid describes: {layout, width, height, tile, overlap, levels, format, base, perMetre}.
// base stands before the names of its files; perMetre are the pixels of a metre, or 0.
function tileSourceOf(pyramid) {
  const { layout, base, format } = pyramid;
  if (layout === "deepzoom") {
    return {
      Image: {
        xmlns: "http://schemas.microsoft.com/deepzoom/2008",
        Url: base,
        Format: format,
        Overlap: String(pyramid.overlap),
        TileSize: String(pyramid.tile),
        Size: { Width: String(pyramid.width), Height: String(pyramid.height) },
      },
    };
  }
  if (layout === "iiif") {
    return {
      "@context": "http://iiif.io/api/image/3/context.json",
      id: base.replace(/\/$/, ""),
      type: "ImageService3",
      protocol: "http://iiif.io/api/image",
      profile: "level0",
      width: pyramid.width,
      height: pyramid.height,
      preferredFormats: [format],
      extraFormats: [format],
      tiles: [{ width: pyramid.tile, scaleFactors: [...Array(pyramid.levels).keys()].map((k) => 2 ** k) }],
    };
  }
  // All tiles are whole squares, so the picture lies at the top left of one large square.
  const side = pyramid.tile * 2 ** (pyramid.levels - 1);
  return {
    width: side,
    height: side,
    tileSize: pyramid.tile,
    minLevel: 0,
    maxLevel: pyramid.levels - 1,
    getTileUrl: (level, x, y) => `${base}${level}/${x}/${y}.${format}`,
    tileExists: (level, x, y) => {
      const size = 2 ** (pyramid.levels - 1 - level) * pyramid.tile;
      return x * size < pyramid.width && y * size < pyramid.height;
    },
  };
}

// The longest of 1, 2 or 5 times a power of ten metres that is at most so many pixels of the screen wide.
function scaleBarOf(screenPixelsPerMetre, most) {
  const longest = most / screenPixelsPerMetre;
  const power = 10 ** Math.floor(Math.log10(longest));
  const length = [5, 2, 1].map((digit) => digit * power).find((metres) => metres <= longest) || power;
  const units = [["km", 1e3], ["m", 1], ["cm", 1e-2], ["mm", 1e-3], ["\u00b5m", 1e-6], ["nm", 1e-9]];
  const [unit, metres] = units.find(([, size]) => length >= size * 0.999999) || units[units.length - 1];
  return { width: length * screenPixelsPerMetre, text: `${Number((length / metres).toPrecision(3))} ${unit}` };
}

function addScaleBar(viewer, width, perMetre) {
  const bar = document.createElement("div");
  bar.className = "scale-bar";
  viewer.addControl(bar, { anchor: OpenSeadragon.ControlAnchor.BOTTOM_LEFT });
  const update = () => {
    const zoom = viewer.viewport.getZoom(true) * viewer.viewport.getContainerSize().x / width;
    const { width: pixels, text } = scaleBarOf(zoom * perMetre, 160);
    bar.style.width = `${pixels}px`;
    bar.style.boxSizing = "border-box";
    bar.style.minWidth = "0";
    bar.textContent = text;
  };
  for (const event of ["animation", "open", "resize"]) viewer.addHandler(event, update);
  update();
  return bar;
}

function makeViewer(element, images) {
  window.viewer = OpenSeadragon({
    id: element,
    prefixUrl: images,
    drawer: "canvas",
    showNavigator: true,
    showRotationControl: false,
    maxZoomPixelRatio: 16,
    visibilityRatio: 0.5,
    gestureSettingsMouse: { clickToZoom: false, dblClickToZoom: true },
  });
  return window.viewer;
}

function openPyramid(element, images, pyramid) {
  const viewer = makeViewer(element, images);
  const padded = pyramid.layout === "xyz";
  viewer.addHandler("open", () => {
    if (!padded) return;
    const item = viewer.world.getItemAt(0);
    item.setClip(new OpenSeadragon.Rect(0, 0, pyramid.width, pyramid.height));
    const shown = item.imageToViewportRectangle(0, 0, pyramid.width, pyramid.height);
    viewer.viewport.fitBounds(shown, true);
  });
  viewer.open(tileSourceOf(pyramid));
  viewer.addOnceHandler("open", () => {
    const width = padded ? viewer.world.getItemAt(0).source.dimensions.x : pyramid.width;
    if (pyramid.perMetre > 0) addScaleBar(viewer, width, pyramid.perMetre);
    document.querySelector(`#${element} .openseadragon-canvas`)?.focus();
  });
}
