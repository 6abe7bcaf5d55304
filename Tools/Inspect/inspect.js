// The inspect report page: draws the recording data embedded in the page (see InspectTrace.cpp
// for its shape) with dygraphs. Plain script, no modules, no network.
"use strict";

(() => {
  const started = performance.now();
  const data = JSON.parse(document.getElementById("recording-data").textContent);
  const frames = data.frames;
  const frameCount = frames.t.length;

  const REGION_NAMES = ["no region", "play/pause", "volume down", "volume up"];
  const REGION_HUES = [0, 213, 28, 150];
  const STATE_COLOURS = {
    STARTTOUCH: "rgba(80, 140, 255, 0.18)",
    TOUCHING: "rgba(80, 140, 255, 0.12)",
    SUPPRESSHOLD: "rgba(200, 80, 80, 0.14)",
    STARTHOLD: "rgba(40, 170, 90, 0.22)",
    HOLDING: "rgba(40, 170, 90, 0.14)",
    ENDHOLD: "rgba(40, 170, 90, 0.30)",
    TAP: "rgba(240, 190, 20, 0.35)",
    SUPPRESSTAP: "rgba(220, 60, 140, 0.25)",
    ENDTOUCH: "rgba(120, 120, 120, 0.25)",
  };
  const EVENT_COLOURS = {
    "may-begin": "#5b8def", "hold-start": "#1b9e5a", "hold-change": "#7cb342", "hold-end": "#0b6b3a",
    "tap": "#e6a700", "cancel": "#c62828", "firmware-reset": "#6a1b9a",
  };

  const element = (tag, attributes = {}, text) => {
    const node = document.createElement(tag);
    for (const [name, value] of Object.entries(attributes)) node.setAttribute(name, value);
    if (text !== undefined) node.textContent = text;
    return node;
  };
  const svgElement = (tag, attributes) => {
    const node = document.createElementNS("http://www.w3.org/2000/svg", tag);
    for (const [name, value] of Object.entries(attributes)) node.setAttribute(name, value);
    return node;
  };
  const stateName = (label) => label.split(" ", 1)[0];
  const formatMs = (t) => t.toFixed(t < 100 ? 3 : 1);

  // Channel colours: one hue per region, shades within it.
  const channelColours = (() => {
    const seen = [0, 0, 0, 0];
    return data.channels.map((channel) => {
      const shade = seen[channel.region]++;
      return `hsl(${REGION_HUES[channel.region]}, ${channel.region ? 70 : 0}%, ${30 + (shade * 37) % 40}%)`;
    });
  })();

  // The frame nearest to time t (frames are in time order).
  function nearestFrame(t) {
    let low = 0, high = frameCount - 1;
    while (low < high) {
      const middle = (low + high) >> 1;
      if (frames.t[middle] < t) low = middle + 1; else high = middle;
    }
    if (low > 0 && Math.abs(frames.t[low - 1] - t) <= Math.abs(frames.t[low] - t)) return low - 1;
    return low;
  }

  // Markers on the time axis: gestures, parameter writes, firmware events and frame-number gaps.
  const markers = [];
  for (const event of data.events) {
    if (event.kind === "firmware-reset") continue;  // drawn from the firmware events below
    const label = event.regionName && event.region ? `${event.kind} · ${event.regionName}` : event.kind;
    markers.push({ t: event.t, label, colour: EVENT_COLOURS[event.kind] || "#333" });
  }
  for (const write of data.stateWrites) markers.push({ t: write.t, label: `${write.key} = ${write.value}`, colour: "#555", dashed: true });
  for (const fw of data.firmwareEvents) {
    markers.push({ t: fw.t, label: fw.event === 0 ? "firmware reset" : `firmware event ${fw.event}`, colour: EVENT_COLOURS["firmware-reset"] });
  }
  for (const gap of data.gaps) {
    markers.push({ t: gap.t, label: `gap ${gap.previousFrameNumber} → ${gap.frameNumber}`, colour: "#b71c1c", dashed: true });
  }
  markers.sort((a, b) => a.t - b.t);

  // Runs of one gesture state, for the trace chart's background.
  const stateRuns = [];
  for (let i = 0; i < frameCount; i++) {
    const name = stateName(frames.label[i]);
    const end = i + 1 < frameCount ? frames.t[i + 1] : frames.t[i];
    const last = stateRuns[stateRuns.length - 1];
    if (last && last.name === name) last.end = end;
    else if (name) stateRuns.push({ name, start: frames.t[i], end });
  }

  let pinnedFrame = frameCount ? 0 : -1;

  function drawMarkers(context, area, chart, withLabels) {
    const [left, right] = chart.xAxisRange();
    const rowEnds = [-Infinity, -Infinity, -Infinity, -Infinity];
    context.save();
    context.font = "11px system-ui, sans-serif";
    context.textBaseline = "top";
    for (const marker of markers) {
      if (marker.t < left || marker.t > right) continue;
      const x = Math.round(chart.toDomXCoord(marker.t)) + 0.5;
      context.strokeStyle = marker.colour;
      context.setLineDash(marker.dashed ? [4, 3] : []);
      context.beginPath();
      context.moveTo(x, area.y);
      context.lineTo(x, area.y + area.h);
      context.stroke();
      if (!withLabels) continue;
      const width = context.measureText(marker.label).width + 6;
      const row = rowEnds.findIndex((end) => end < x);
      if (row < 0) continue;
      rowEnds[row] = x + width;
      context.fillStyle = "rgba(255, 255, 255, 0.85)";
      context.fillRect(x + 1, area.y + 2 + row * 14, width - 2, 13);
      context.fillStyle = marker.colour;
      context.fillText(marker.label, x + 3, area.y + 3 + row * 14);
    }
    if (pinnedFrame >= 0) {
      const x = Math.round(chart.toDomXCoord(frames.t[pinnedFrame])) + 0.5;
      context.setLineDash([]);
      context.strokeStyle = "rgba(0, 0, 0, 0.45)";
      context.beginPath();
      context.moveTo(x, area.y);
      context.lineTo(x, area.y + area.h);
      context.stroke();
    }
    context.restore();
  }

  function drawStateRuns(context, area, chart) {
    const [left, right] = chart.xAxisRange();
    context.save();
    context.font = "10px system-ui, sans-serif";
    context.textBaseline = "bottom";
    for (const run of stateRuns) {
      if (run.end < left || run.start > right) continue;
      const x0 = chart.toDomXCoord(run.start), x1 = chart.toDomXCoord(run.end);
      context.fillStyle = STATE_COLOURS[run.name] || "rgba(0, 0, 0, 0.08)";
      context.fillRect(x0, area.y, Math.max(1, x1 - x0), area.h);
      if (x1 - x0 > context.measureText(run.name).width + 4) {
        context.fillStyle = "#444";
        context.fillText(run.name, x0 + 2, area.y + area.h - 2);
      }
    }
    context.restore();
  }

  // Charts share one time axis: zooming or panning one moves the others.
  const charts = [];
  let syncing = false;
  function synchronise(source) {
    if (syncing) return;
    syncing = true;
    const range = source.xAxisRange();
    for (const chart of charts) if (chart !== source) chart.updateOptions({ dateWindow: range });
    syncing = false;
  }
  function redrawAll() {
    for (const chart of charts) chart.updateOptions({});
  }

  const fullRange = (() => {
    const times = [frames.t, data.accel.t, data.events.map((e) => e.t), markers.map((m) => m.t)].flat();
    if (!times.length) return [0, 1];
    let low = Infinity, high = -Infinity;
    for (const t of times) { low = Math.min(low, t); high = Math.max(high, t); }
    return high > low ? [low, high] : [low - 1, low + 1];
  })();

  // Drawing every frame of a long recording costs more than the plot has pixels to show it on:
  // the rows handed to dygraphs keep, per pixel column, each series' minimum and maximum (so
  // spikes stay visible), and all rows once zoomed in far enough.
  function envelope(rows, from, to, buckets) {
    if (to - from <= 2 * buckets) return rows.slice(from, to);
    const reduced = [];
    const start = rows[from][0];
    const width = (rows[to - 1][0] - start) / buckets || 1;
    for (let i = from; i < to;) {
      const bucketEnd = start + width * (Math.floor((rows[i][0] - start) / width) + 1);
      const low = rows[i].slice(), high = rows[i].slice();
      let j = i + 1;
      for (; j < to && rows[j][0] < bucketEnd; j++) {
        const row = rows[j];
        for (let s = 1; s < row.length; s++) {
          const v = row[s];
          if (v === null) continue;
          if (low[s] === null || v < low[s]) low[s] = v;
          if (high[s] === null || v > high[s]) high[s] = v;
        }
      }
      reduced.push(low);
      if (j - 1 > i) {
        high[0] = rows[j - 1][0];
        reduced.push(high);
      }
      i = j;
    }
    return reduced;
  }

  // First row at or after t.
  function rowAt(rows, t) {
    let low = 0, high = rows.length;
    while (low < high) {
      const middle = (low + high) >> 1;
      if (rows[middle][0] < t) low = middle + 1; else high = middle;
    }
    return low;
  }

  // The rows for a view of [left, right]: detailed inside it, coarse outside it, so that the
  // whole recording stays in the chart's data for zooming out.
  function rowsForView(rows, [left, right], pixels) {
    const from = Math.max(0, rowAt(rows, left) - 1), to = Math.min(rows.length, rowAt(rows, right) + 1);
    return [...envelope(rows, 0, from, 100), ...envelope(rows, from, to, pixels), ...envelope(rows, to, rows.length, 100)];
  }

  function makeChart(containerId, rows, labels, options, underlay) {
    const container = document.getElementById(containerId);
    const pixels = Math.max(200, container.clientWidth);
    let shownRange = fullRange.slice();
    const refreshRows = (g) => {
      const range = g.xAxisRange();
      if (range[0] === shownRange[0] && range[1] === shownRange[1]) return;
      shownRange = range.slice();
      setTimeout(() => g.updateOptions({ file: rowsForView(rows, shownRange, pixels) }), 0);
    };
    const chart = new Dygraph(container, rowsForView(rows, fullRange, pixels), {
      labels,
      dateWindow: fullRange.slice(),
      xlabel: "time (ms since the first frame)",
      legend: "follow",
      labelsSeparateLines: true,
      highlightSeriesOpts: null,
      axes: { x: { valueFormatter: (t) => `${formatMs(t)} ms` } },
      underlayCallback: underlay,
      drawCallback: (g, initial) => {
        if (initial) return;
        refreshRows(g);
        synchronise(g);
      },
      highlightCallback: (event, t) => showFrame(nearestFrame(t)),
      unhighlightCallback: () => showFrame(pinnedFrame),
      clickCallback: (event, t) => pinFrame(nearestFrame(t)),
      ...options,
    });
    charts.push(chart);
    return chart;
  }

  function addToggles(containerId, chart, names, colours, visible) {
    const container = document.getElementById(containerId);
    names.forEach((name, index) => {
      const box = element("input", { type: "checkbox", "data-series": name });
      box.checked = visible[index];
      box.addEventListener("change", () => chart.setVisibility(index, box.checked));
      const label = element("label");
      const swatch = element("span", { class: "swatch" });
      swatch.style.background = colours[index];
      label.append(box, swatch, name);
      container.append(label);
    });
  }

  function channelsChart() {
    const names = data.channels.map((c) => c.name);
    const rows = frames.t.map((t, i) => [t, ...frames.raw[i]]);
    if (!rows.length) rows.push([0, ...names.map(() => null)]);
    const chart = makeChart("channels-chart", rows, ["t", ...names], {
      colors: channelColours, strokeWidth: 1.2, ylabel: "signed value", legend: "never",
    }, (context, area, g) => drawMarkers(context, area, g, true));
    addToggles("channel-toggles", chart, names, channelColours, names.map(() => true));
  }

  // The score axis spans the bounded series: the tap score and the time/duration ratio reach
  // millions in some frames, which would flatten everything else. Their values show in the
  // legend; drag vertically to see beyond the range.
  function typicalRange(columns) {
    const values = columns.flat().filter((v) => v !== null && Number.isFinite(v)).sort((a, b) => a - b);
    if (!values.length) return null;
    const low = values[0], high = values[values.length - 1];
    const margin = Math.max(1, (high - low) * 0.1);
    return [low - margin, high + margin];
  }

  function traceChart() {
    const series = [
      ["touch score", frames.touchScore, "#1f4e9e", "y"],
      ["frame score", frames.frameScore, "#7e57c2", "y"],
      ["tap score", frames.tapScore, "#e6a700", "y"],
      ["sd", frames.sd, "#8d6e63", "y"],
      ["tsd", frames.tsd, "#c0ca33", "y"],
      ["time/duration ratio", frames.timeDurationRatio, "#26a69a", "y"],
      ["non-active pixels", frames.nonActivePixels, "#90a4ae", "y2"],
      ["active region", frames.region, "#d81b60", "y2"],
    ];
    const rows = frames.t.map((t, i) => [t, ...series.map((s) => s[1][i])]);
    if (!rows.length) rows.push([0, ...series.map(() => null)]);
    const seriesOptions = {};
    for (const [name, , , axis] of series) seriesOptions[name] = { axis };
    seriesOptions["active region"].stepPlot = true;
    seriesOptions["active region"].strokeWidth = 2;
    const chart = makeChart("trace-chart", rows, ["t", ...series.map((s) => s[0])], {
      colors: series.map((s) => s[2]), series: seriesOptions, ylabel: "score", y2label: "pixels · region",
      valueRange: typicalRange([frames.touchScore, frames.frameScore, frames.sd, frames.tsd]),
      axes: { x: { valueFormatter: (t) => `${formatMs(t)} ms` }, y2: { independentTicks: true } },
    }, (context, area, g) => { drawStateRuns(context, area, g); drawMarkers(context, area, g, false); });
    addToggles("trace-toggles", chart, series.map((s) => s[0]), series.map((s) => s[2]), series.map(() => true));
  }

  function accelerometerChart() {
    if (!data.accel.t.length) return;
    document.getElementById("accel-section").hidden = false;
    const rows = data.accel.t.map((t, i) => [t, data.accel.x[i], data.accel.y[i], data.accel.z[i]]);
    makeChart("accel-chart", rows, ["t", "X", "Y", "Z"], {
      colors: ["#e53935", "#43a047", "#1e88e5"], ylabel: "g",
      highlightCallback: (event, t) => showFrame(nearestFrame(t)),
    }, (context, area, g) => drawMarkers(context, area, g, false));
  }

  // The sensor view: the fifteen channels at their places, shaded by the scaled value.
  const sensorCells = [];
  function buildSensorView() {
    const svg = svgElement("svg", { viewBox: "-1.2 -1.2 20.4 14.4", role: "img", "aria-label": "sensor channels" });
    svg.append(svgElement("rect", { x: -1.2, y: -1.2, width: 20.4, height: 14.4, rx: 1, fill: "#f4f4f6" }));
    data.channels.forEach((channel, index) => {
      const cells = channel.electrodes.map(([x, y]) => {
        const group = svgElement("g", {});
        const disc = svgElement("circle", { cx: x, cy: y, r: 1.05, stroke: channelColours[index], "stroke-width": 0.12 });
        const name = svgElement("text", { x, y: y - 0.25, "text-anchor": "middle", "font-size": 0.6, fill: "#333" });
        name.textContent = channel.name;
        const value = svgElement("text", { x, y: y + 0.55, "text-anchor": "middle", "font-size": 0.55, fill: "#111" });
        group.append(disc, name, value);
        svg.append(group);
        return { disc, value };
      });
      sensorCells.push(cells);
    });
    document.getElementById("sensor-view").append(svg);
  }

  function shade(region, value) {
    const strength = Math.max(0, Math.min(1, value / 600));
    return `hsl(${REGION_HUES[region]}, ${region ? 75 : 0}%, ${96 - 56 * strength}%)`;
  }

  let shownFrame = -1;
  function showFrame(index) {
    if (index < 0 || index === shownFrame) return;
    shownFrame = index;
    const active = frames.active[index];
    data.channels.forEach((channel, c) => {
      for (const cell of sensorCells[c]) {
        cell.disc.setAttribute("fill", shade(channel.region, frames.scaled[index][c]));
        cell.disc.setAttribute("stroke-width", active & (1 << c) ? 0.35 : 0.12);
        cell.value.textContent = frames.raw[index][c];
      }
    });
    const details = document.getElementById("frame-details");
    details.replaceChildren();
    const add = (name, value) => details.append(element("dt", {}, name), element("dd", {}, String(value)));
    add("frame", frames.frame[index]);
    add("time", `${formatMs(frames.t[index])} ms (device ${frames.timeMs[index]} ms)`);
    add("state", frames.label[index] || "idle");
    add("region", REGION_NAMES[frames.region[index]] || frames.region[index]);
    add("touch score", frames.touchScore[index]);
    add("tap score", frames.tapScore[index]);
    const values = data.channels.map((c, i) =>
      `${c.name} ${String(frames.raw[index][i]).padStart(5)} ${String(frames.scaled[index][i]).padStart(5)}${active & (1 << i) ? " ON" : ""}`);
    add("raw · scaled", "");
    details.lastChild.append(element("pre", { class: "values" }, values.join("\n")));
  }

  function pinFrame(index) {
    pinnedFrame = index;
    shownFrame = -1;
    showFrame(index);
    redrawAll();
  }

  function zoomTo(t) {
    const half = Math.max(250, (fullRange[1] - fullRange[0]) / 40);
    syncing = true;
    for (const chart of charts) chart.updateOptions({ dateWindow: [t - half, t + half] });
    syncing = false;
  }

  function buildEventsTable() {
    const body = document.querySelector("#events-table tbody");
    const rows = data.events.map((event) => {
      const row = element("tr", {
        "data-ns": event.ns, "data-kind": event.kind,
        "data-region": event.region === undefined ? "" : event.region,
        "data-frame": event.frame === undefined ? "" : event.frame,
      });
      row.append(
        element("td", {}, formatMs(event.t)),
        element("td", {}, event.kind),
        element("td", {}, event.regionName || ""),
        element("td", {}, event.frame === undefined ? "" : String(event.frame)));
      row.addEventListener("click", () => {
        for (const other of body.querySelectorAll("tr.current")) other.classList.remove("current");
        row.classList.add("current");
        zoomTo(event.t);
        if (frameCount) pinFrame(nearestFrame(event.t));
      });
      return row;
    });
    body.append(...rows);
  }

  function buildSummary() {
    const s = data.summary;
    const list = document.getElementById("summary");
    const add = (name, key, value) => list.append(element("dt", {}, name), element("dd", { "data-key": key }, String(value)));
    add("source", "source", data.source);
    add("container version", "containerVersion", s.containerVersion);
    add("duration (ms)", "durationMs", (s.durationNs / 1e6).toFixed(3));
    add("frames", "frames", s.frames);
    add("state frames", "stateFrames", s.stateFrames);
    add("input reports", "inputReportFrames", s.inputReportFrames);
    add("images", "imageFrames", s.imageFrames);
    add("firmware events", "firmwareEventFrames", s.firmwareEventFrames);
    add("other reports", "otherReportFrames", s.otherReportFrames);
    add("metadata frames", "metadataFrames", s.metadataFrames);
    for (const [key, count] of Object.entries(s.metadataKeys)) add(`· ${key}`, `metadata:${key}`, count);
    add("frame-number gaps", "gaps", s.gaps.length);
    add("resets", "resets", s.resets);
    add("gesture events", "events", data.events.length);
    const stats = data.finalStats || {};
    for (const [group, counters] of Object.entries((stats.EventStats) || {})) {
      const nonZero = Object.entries(counters).filter(([, n]) => n !== 0).map(([name, n]) => `${name} ${n}`);
      add(`${group.toLowerCase()}`, `EventStats:${group}`, nonZero.join(", ") || "none");
    }
    for (const [name, value] of Object.entries(stats.DebugInfo || {})) add(name, `DebugInfo:${name}`, value);
  }

  buildSummary();
  buildEventsTable();
  buildSensorView();
  channelsChart();
  traceChart();
  accelerometerChart();
  showFrame(pinnedFrame);

  const elapsed = performance.now() - started;
  document.body.dataset.renderMs = elapsed.toFixed(0);
  document.body.dataset.ready = "true";
  document.getElementById("footer").textContent =
    `${frameCount} image frames · ${data.events.length} events · drawn in ${elapsed.toFixed(0)} ms`;
})();
