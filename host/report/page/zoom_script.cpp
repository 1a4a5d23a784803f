#include "host/report/page/zoom_script.h"

namespace quazor {

std::string_view zoomScript() {
  return R"js(
'use strict';
(() => {
Dygraph.PLUGINS = Dygraph.PLUGINS.filter(one => one !== Dygraph.Plugins.Legend);  // the policy refuses its styles
const HINT = 'Drag over a part to see it larger; a double click shows all.';
const COLUMNS = 1000;
const LEAST_SPAN = 0.1;  // milliseconds
const MARGIN = 0.1;  // above and below the curve, of its span

function numbersOf(template) {
  const bytes = atob(template.content.textContent);
  const numbers = new Float64Array(bytes.length);
  let count = 0, last = 0, usual = null;
  for (let at = 0; at < bytes.length;) {
    let folded = 0, scale = 1, group;
    do {
      group = bytes.charCodeAt(at++);
      folded += (group % 128) * scale;
      scale *= 128;
    } while (group > 127);
    const number = folded % 2 ? -(folded + 1) / 2 : folded / 2;
    if (usual === null) {
      usual = number;
    } else {
      last += usual + number;
      numbers[count++] = last;
    }
  }
  return numbers.subarray(0, count);
}

// x in seconds and y in milliseconds, ascending in x: a device may tell times that go back.
function curveOf(times, values) {
  let isSorted = true;
  for (let i = 1; i < times.length && isSorted; ++i) isSorted = times[i] >= times[i - 1];
  const count = times.length;
  const x = new Float64Array(count), y = new Float64Array(count);
  const order = isSorted ? null : Array.from(times.keys()).sort((one, other) => times[one] - times[other] || one - other);
  for (let i = 0; i < count; ++i) {
    const from = order ? order[i] : i;
    x[i] = times[from] / 1e9;
    y[i] = values[from] / 1e6;
  }
  return {x, y};
}

function intervalsOf(times) {
  const values = new Float64Array(times.length - 1);
  for (let i = 0; i < values.length; ++i) values[i] = times[i + 1] - times[i];
  return curveOf(times.subarray(1), values);
}

// The index of the first x that is not below the value.
function firstFrom(x, value) {
  let begin = 0, end = x.length;
  while (begin < end) {
    const middle = (begin + end) >> 1;
    if (x[middle] < value) begin = middle + 1; else end = middle;
  }
  return begin;
}

// What is drawn of the part, with the first and the last point of all.
function partOf({x, y}, begin, end) {
  const first = Math.max(firstFrom(x, begin) - 1, 0);
  const last = Math.min(firstFrom(x, end) + 1, x.length);
  const rows = [];
  let least = Infinity, greatest = -Infinity;
  const add = i => rows.push([x[i], y[i]]);
  if (first > 0) add(0);
  const width = Math.max((x[last - 1] - x[first]) / COLUMNS, Number.MIN_VALUE);
  for (let i = first; i < last;) {
    const stop = last - first > 2 * COLUMNS ? x[first] + (Math.floor((x[i] - x[first]) / width) + 1) * width : x[i];
    let low = i, high = i;
    for (++i; i < last && x[i] < stop; ++i) {
      if (y[i] < y[low]) low = i;
      if (y[i] > y[high]) high = i;
    }
    add(Math.min(low, high));
    if (low !== high) add(Math.max(low, high));
    least = Math.min(least, y[low]);
    greatest = Math.max(greatest, y[high]);
  }
  if (last < x.length) add(x.length - 1);
  const half = Math.max(greatest - least, LEAST_SPAN) * (0.5 + MARGIN), middle = (least + greatest) / 2;
  return {rows, range: [middle - half, middle + half]};
}

function colors() {
  const style = getComputedStyle(document.documentElement);
  const colorOf = name => style.getPropertyValue(name).trim();
  return {colors: [colorOf('--curve')], gridLineColor: colorOf('--line'), axisLineColor: colorOf('--soft'),
          mark: colorOf('--fail')};
}

// Seconds to the microsecond, milliseconds to the nanosecond.
const textOf = value => value.toFixed(6).replace(/\.?0+$/, '');

function draw(figure, curve, marks) {
  const label = figure.querySelector('svg').getAttribute('aria-label');
  const chart = document.createElement('div');
  const legend = document.createElement('p');
  const buttons = document.createElement('p');
  chart.className = 'chart';
  chart.setAttribute('role', 'img');
  chart.setAttribute('aria-label', label);
  legend.className = 'legend soft';
  legend.textContent = HINT;
  buttons.className = 'buttons';
  figure.append(chart, legend, buttons);
  figure.classList.add('live');
  const whole = [curve.x[0], curve.x[curve.x.length - 1]];
  let graph = null, shown = whole, look = colors();
  const part = partOf(curve, ...whole);
  const show = (begin, end) => {
    const length = Math.min(end - begin, whole[1] - whole[0]);
    begin = Math.min(Math.max(begin, whole[0]), whole[1] - length);
    shown = [begin, begin + length];
    const {rows, range} = partOf(curve, ...shown);
    graph.updateOptions({file: rows, dateWindow: shown, valueRange: range});
  };
  graph = new Dygraph(chart, part.rows, {
    labels: ['s', 'ms'], dateWindow: whole, valueRange: part.range, strokeWidth: 1.5, ...look,
    highlightCallback: (event, x, points) => {
      legend.textContent = 'At ' + textOf(x) + ' s: ' + textOf(points[0].yval) + ' ms';
    },
    unhighlightCallback: () => legend.textContent = HINT,
    underlayCallback: (canvas, area, plot) => {
      canvas.fillStyle = look.mark;
      canvas.globalAlpha = 0.55;
      const end = firstFrom(marks, shown[1]) + 1;
      for (let i = firstFrom(marks, shown[0]), last = NaN; i < end && i < marks.length; ++i) {
        const at = Math.round(plot.toDomXCoord(marks[i]));
        if (at !== last) canvas.fillRect(at, area.y, 1.5, area.h);
        last = at;
      }
      canvas.globalAlpha = 1;
    },
    drawCallback: plot => {  // perhaps after a drag or a double click
      const [begin, end] = plot.xAxisRange();
      if (graph && (begin !== shown[0] || end !== shown[1])) show(begin, end);
    },
  });
  figure.plot = graph;  // for who looks at it in the console
  const button = (text, part) => {
    const element = document.createElement('button');
    element.type = 'button';
    element.textContent = text;
    element.setAttribute('aria-label', text + ': ' + label);
    element.addEventListener('click', () => show(...part(...shown, shown[1] - shown[0])));
    buttons.append(element, ' ');
  };
  button('Zoom in', (begin, end, length) => [begin + length / 4, end - length / 4]);
  button('Zoom out', (begin, end, length) => [begin - length / 2, end + length / 2]);
  button('Earlier', (begin, end, length) => [begin - length / 2, end - length / 2]);
  button('Later', (begin, end, length) => [begin + length / 2, end + length / 2]);
  button('All', () => whole);
  matchMedia('(prefers-color-scheme:dark)').addEventListener('change', () => {
    look = colors();
    graph.updateOptions(look);
  });
}

// A plot in a closed section has no width and is drawn when the section is opened.
function drawVisible() {
  for (const stream of document.querySelectorAll('.stream')) {
    const figures = [...stream.querySelectorAll('figure.zoom:not(.live)')].filter(one => one.clientWidth > 0);
    if (figures.length === 0) continue;
    const times = numbersOf(stream.querySelector('template.captured'));
    const marks = numbersOf(stream.querySelector('template.marks')).map(time => time / 1e9);
    for (const figure of figures) {
      const offsets = figure.querySelector('template.offsets');
      if (offsets) draw(figure, curveOf(times, numbersOf(offsets)), new Float64Array(0));
      else draw(figure, intervalsOf(times), marks);
    }
  }
}

document.addEventListener('toggle', drawVisible, true);
drawVisible();
})();
)js";
}

}  // namespace quazor
