// Colors and patterns of the charts, for light, dark and paper.

import { families } from "./kinds.js";

const isDark = () => matchMedia("(prefers-color-scheme: dark)").matches;
export const isPaper = () => matchMedia("print").matches;

/** The colors of the style sheet, as they are now. */
export function readColors() {
  const style = getComputedStyle(document.documentElement);
  const names = ["ground", "raised", "text", "quiet", "line", "accent", "hatch", "good", "bad", "warn"];
  return Object.fromEntries(names.map((name) => [name, style.getPropertyValue(`--${name}`).trim()]));
}

export const familyColor = (family) => (isDark() && !isPaper() ? family.dark : family.light);

const parse = (color) => [1, 3, 5].map((at) => parseInt(color.slice(at, at + 2), 16));

/** How strongly a count shows, from 0.32 to 1: its logarithm against that of the highest. */
export const strengthOf = (count, most) => 0.32 + 0.68 * (Math.log10(1 + count) / Math.log10(1 + most));

export function mix(color, ground, strength) {
  const [front, back] = [parse(color), parse(ground)];
  return `#${front.map((value, index) => Math.round(value * strength + back[index] * (1 - strength)).toString(16).padStart(2, "0")).join("")}`;
}

/** Black or white, whichever reads better on a color. */
export function inkOn(color) {
  const [red, green, blue] = parse(color).map((value) => (value / 255) ** 2.2);
  return 0.2126 * red + 0.7152 * green + 0.0722 * blue > 0.22 ? "#000000" : "#ffffff";
}

function tile(size, draw) {
  const canvas = document.createElement("canvas");
  canvas.width = canvas.height = size;
  const pen = canvas.getContext("2d");
  draw(pen, size);
  return canvas;
}

/** Lines across a tile, so that tiles join: [x, y] to [x, y]. */
function lines(pen, color, width, ends) {
  pen.strokeStyle = color;
  pen.lineWidth = width;
  pen.beginPath();
  for (const [fromX, fromY, toX, toY] of ends) {
    pen.moveTo(fromX, fromY);
    pen.lineTo(toX, toY);
  }
  pen.stroke();
}

const rising = (size) => [[-2, size + 2, size + 2, -2], [-2, 2, 2, -2], [size - 2, size + 2, size + 2, size - 2]];
const falling = (size) => [[-2, -2, size + 2, size + 2], [size - 2, -2, size + 2, 2], [-2, size - 2, 2, size + 2]];

/** The hatching of what could not be seen: falling lines, dense where nothing at all was seen. */
export function hatch(context, color, isTotal) {
  const size = isTotal ? 6 : 12;
  return context.createPattern(tile(size, (pen) => lines(pen, color, 1, falling(size))), "repeat");
}

/** On paper each family has a pattern of its own; a higher count makes it blacker. */
const papers = {
  load: (pen, size, width) => lines(pen, "#000000", width, rising(size)),
  path: (pen, size, width) => lines(pen, "#000000", width, [[0, size / 2, size, size / 2], [size / 2, 0, size / 2, size]]),
  SCSI: (pen, size, width) => lines(pen, "#000000", width, [[0, size / 2, size, size / 2]]),
  fabric: (pen, size, width) => lines(pen, "#000000", width, [[size / 2, 0, size / 2, size]]),
  adapter: (pen, size, width) => {
    pen.beginPath();
    pen.arc(size / 2, size / 2, width, 0, 7);
    pen.fill();
  },
};

/** What a cell is filled with, and the color of a letter on it. */
export function fillOf(context, family, strength, ground) {
  if (isPaper()) {
    const pattern = tile(5, (pen, size) => papers[family.name](pen, size, 0.4 + 1.6 * strength));
    return { fill: context.createPattern(pattern, "repeat"), ink: "#000000", isPattern: true };
  }
  const color = mix(familyColor(family), ground, strength);
  return { fill: color, ink: inkOn(color), isPattern: false };
}

/** A square of each family, as it shows in the chart. */
export function swatch(family) {
  const canvas = document.createElement("canvas");
  canvas.width = canvas.height = 24;
  canvas.className = "swatch";
  canvas.setAttribute("aria-hidden", "true");
  const pen = canvas.getContext("2d");
  pen.scale(2, 2);
  pen.fillStyle = fillOf(pen, family, 0.85, isDark() ? "#15171a" : "#ffffff").fill;
  pen.fillRect(0, 0, 12, 12);
  return canvas;
}

export const familyNames = families.map((family) => family.name);
