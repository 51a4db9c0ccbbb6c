// The viewer page: a timeline of level-of-detail views the server computes, the surface at one
// frame with its snapshot's numbers, and a what-if replay under other settings. An exported page
// carries its data in window.TOLKA_EXPORT and asks no server. A live page (the server follows the
// running daemon) polls the newest snapshots and scrolls the last 30 s of timeline.
"use strict";
(function () {
  const EXPORTED = window.TOLKA_EXPORT || null;
  const KIND_COLOURS = {"may-begin": "#737373", "hold-start": "#d62728", "hold-change": "#9467bd",
    "hold-end": "#8c564b", "tap": "#2ca02c", "cancel": "#7f7f7f", "reset": "#000000"};
  const REGION_COLOURS = ["#ffffff", "#2ca02c", "#1f77b4", "#ff7f0e"];
  const HAND_COLOURS = ["#ffffff", "#17becf", "#d62728", "#999999"];
  const BAND_ROWS = ["what-if events", "events", "eval mismatches", "labels", "active region", "hand"];
  const MISMATCH_COLOURS = {"missed": "#d62728", "false": "#ff7f0e", "split": "#9467bd", "merged": "#8c564b", "wrong zone": "#e377c2"};

  const state = {from: null, to: null, frame: 0, settings: null};
  let info = null;
  let frameValues = null;
  let whatIf = null;
  let applyingView = false;
  let timelineRequest = 0;

  // Data ------------------------------------------------------------------------------------
  function query(params) {
    const search = new URLSearchParams();
    for (const [key, value] of Object.entries(params)) {
      if (value === null || value === undefined) continue;
      if (Array.isArray(value) && value.length === 0) search.append(key, "");  // the defaults, not the opening settings
      else if (Array.isArray(value)) value.forEach(v => search.append(key, v));
      else search.append(key, String(value));
    }
    return search.toString();
  }

  async function api(name, params) {
    if (EXPORTED) return exportedApi(name, params);
    const response = await fetch("api/" + name + "?" + query(params));
    const body = await response.json();
    if (!response.ok) throw new Error(body.error || response.statusText);
    return body;
  }

  function exportedApi(name, params) {
    const data = EXPORTED;
    if (name === "info") return data.info;
    if (name === "timeline") return data.timeline;
    if (name === "frame") {
      const x = data.timeline.x;
      let offset;
      if (params.t !== undefined) {
        offset = 0;
        while (offset + 1 < x.length && Math.abs(x[offset + 1] - params.t) <= Math.abs(x[offset] - params.t)) offset++;
      } else {
        offset = Math.min(Math.max(params.n - data.first, 0), x.length - 1);
      }
      const values = {};
      for (const [key, column] of Object.entries(data.columns)) values[key] = column[offset];
      return {index: data.first + offset, values: values};
    }
    throw new Error("What if needs the server: run tolkatouch view on the recording.");
  }

  function settingsParam() { return state.settings === null ? null : state.settings; }

  // URL state ---------------------------------------------------------------------------------
  function readHash() {
    const search = new URLSearchParams(location.hash.replace(/^#/, ""));
    const number = key => (search.has(key) && search.get(key) !== "" && isFinite(Number(search.get(key)))) ? Number(search.get(key)) : null;
    state.from = number("from");
    state.to = number("to");
    const frame = number("frame");
    state.frame = frame === null ? 0 : Math.max(0, Math.floor(frame));
    state.settings = search.has("set") ? search.getAll("set").filter(s => s !== "") : null;
  }

  function writeHash() {
    const params = {from: state.from === null ? null : round(state.from, 4), to: state.to === null ? null : round(state.to, 4),
      frame: state.frame, set: state.settings === null ? null : state.settings};
    history.replaceState(null, "", "#" + query(params));
  }

  function round(value, digits) { const f = Math.pow(10, digits); return Math.round(value * f) / f; }

  function showStatus(text) { document.getElementById("status").textContent = text; }

  // Timeline ----------------------------------------------------------------------------------
  function discreteScale(colours) {
    const scale = [];
    colours.forEach((colour, i) => { scale.push([i / colours.length, colour]); scale.push([(i + 1) / colours.length, colour]); });
    return scale;
  }

  function eventTrace(events, row, name) {
    return {type: "scatter", mode: "markers", name: name, xaxis: "x", yaxis: "y4", x: events.map(e => e.seconds),
      y: events.map(() => row), text: events.map(e => e.region ? e.kind + " " + e.region : e.kind),
      hovertemplate: "%{text} at %{x:.3f} s<extra>" + name + "</extra>",
      marker: {symbol: "triangle-down", size: 9, color: events.map(e => KIND_COLOURS[e.kind] || "#000")}, showlegend: false};
  }

  // A range with too many events to mark one by one comes as a count per column: drawn as a bar.
  function eventTraces(tl, name, row, title) {
    const traces = [eventTrace(tl[name], row, title)];
    const counts = tl[name + "_per_column"];
    if (counts) traces.push({type: "heatmap", name: title + " per column", x: tl.x, y: [row], z: [counts], xaxis: "x", yaxis: "y4",
      colorscale: [[0, "#ffffff"], [1, "#444444"]], zmin: 0, showscale: false, hovertemplate: "%{z} events<extra>" + title + "</extra>"});
    return traces;
  }

  function timelineFigure(tl) {
    const traces = [
      {type: "heatmap", name: "readings", x: tl.x, y: tl.heat_rows, z: tl.heat, xaxis: "x", yaxis: "y", colorscale: "Viridis",
        zmin: 0, colorbar: {len: 0.45, y: 1, yanchor: "top", thickness: 10, title: {text: "reading"}},
        hovertemplate: "%{y} %{z} at %{x:.3f} s<extra></extra>"},
      {type: "heatmap", name: "on", x: tl.x, y: tl.heat_rows, z: tl.on, xaxis: "x", yaxis: "y2", zmin: 0, zmax: 1,
        colorscale: [[0, "#ffffff"], [1, "#00acc1"]], showscale: false, hovertemplate: "%{y} on %{z} at %{x:.3f} s<extra></extra>"},
      {type: "scatter", mode: "lines", name: "touch score (min)", x: tl.x, y: tl.score_min, xaxis: "x", yaxis: "y3",
        line: {color: "#1f77b4", width: 1}, showlegend: false},
      {type: "scatter", mode: "lines", name: "touch score", x: tl.x, y: tl.score_max, xaxis: "x", yaxis: "y3",
        line: {color: "#1f77b4", width: 1}, fill: tl.bucketed ? "tonexty" : "none"},
      {type: "scatter", mode: "lines", name: "classifier score", x: tl.x, y: tl.svm, xaxis: "x", yaxis: "y3",
        line: {color: "#999999", width: 0.7}},
      {type: "heatmap", name: "hand", x: tl.x, y: [5], z: [tl.hand], xaxis: "x", yaxis: "y4", zmin: -0.5, zmax: 3.5,
        colorscale: discreteScale(HAND_COLOURS), showscale: false, hovertemplate: "hand %{z} (1 touching, 2 holding, 3 hold suppressed)<extra></extra>"},
      {type: "heatmap", name: "active region", x: tl.x, y: [4], z: [tl.region], xaxis: "x", yaxis: "y4", zmin: -0.5, zmax: 3.5,
        colorscale: discreteScale(REGION_COLOURS), showscale: false, hovertemplate: "region %{z}<extra></extra>"},
    ];
    const labelX = [], labelY = [], labelText = [];
    for (const label of info.labels) {
      if (label.end < tl.start || label.start > tl.end) continue;
      const text = label.kind + " " + (label.zone || "") + (label.to_zone ? " to " + label.to_zone : "");
      labelX.push(label.start, label.end, null); labelY.push(3, 3, null); labelText.push(text, text, null);
    }
    traces.push({type: "scatter", mode: "lines", name: "labels", x: labelX, y: labelY, text: labelText, xaxis: "x", yaxis: "y4",
      line: {color: "#444", width: 6}, hovertemplate: "%{text}<extra>label</extra>", showlegend: false});
    for (const [kind, colour] of Object.entries(MISMATCH_COLOURS)) {
      const mismatchX = [], mismatchY = [];
      for (const m of tl.mismatches || []) {
        if (m.kind !== kind) continue;
        const y = kind === "missed" ? 2.18 : 1.82;  // a missed label and the gesture counted false side by side
        mismatchX.push(m.start, Math.max(m.end, m.start + 0.02), null); mismatchY.push(y, y, null);
      }
      if (mismatchX.length) traces.push({type: "scatter", mode: "lines", name: kind, x: mismatchX, y: mismatchY, xaxis: "x", yaxis: "y4",
        line: {color: colour, width: 5}, hovertemplate: kind + "<extra>eval</extra>"});
    }
    const opening = tl.opening_events ? "opening_events" : "events";
    traces.push(...eventTraces(tl, opening, 1, "events"));
    if (tl.opening_events) traces.push(...eventTraces(tl, "events", 0, "what-if events"));

    const cursor = frameValues ? frameValues.seconds : null;
    const shapes = [
      {type: "line", xref: "paper", yref: "y3", x0: 0, x1: 1, y0: 0, y1: 0, line: {color: "#d62728", dash: "dash", width: 1}},
      {type: "line", xref: "paper", yref: "y3", x0: 0, x1: 1, y0: 100, y1: 100, line: {color: "#555", dash: "dot", width: 1}},
      {type: "line", xref: "paper", yref: "y3", x0: 0, x1: 1, y0: -100, y1: -100, line: {color: "#555", dash: "dot", width: 1}},
    ];
    if (cursor !== null) shapes.push({type: "line", xref: "x", yref: "paper", x0: cursor, x1: cursor, y0: 0, y1: 1,
      line: {color: "#e91e63", width: 1.5}});
    const layout = {
      margin: {l: 90, r: 60, t: 10, b: 35}, uirevision: "timeline", hovermode: "closest", shapes: shapes,
      legend: {orientation: "h", x: 0.5, y: 0.375, xanchor: "center", yanchor: "bottom", font: {size: 10}, bgcolor: "rgba(0,0,0,0)"},
      xaxis: {anchor: "y4", range: [state.from, state.to], title: {text: "seconds since the first frame", standoff: 4}},
      yaxis: {domain: [0.58, 1], autorange: "reversed", type: "category", dtick: 1, tickfont: {size: 9},
        title: {text: "reading by zone"}, fixedrange: true},
      yaxis2: {domain: [0.42, 0.565], autorange: "reversed", type: "category", showticklabels: false, title: {text: "on"}, fixedrange: true},
      yaxis3: {domain: [0.20, 0.37], range: [-115, 115], title: {text: "score"}, fixedrange: true},
      yaxis4: {domain: [0, 0.18], range: [-0.5, 5.5], tickvals: [0, 1, 2, 3, 4, 5], ticktext: BAND_ROWS, tickfont: {size: 9}, fixedrange: true},
    };
    return {traces, layout};
  }

  function fetchTimeline() {
    return api("timeline", {from: state.from, to: state.to, columns: 1000, set: settingsParam()});
  }

  async function drawTimeline(pending) {
    const request = ++timelineRequest;
    const tl = await (pending || fetchTimeline());
    if (request !== timelineRequest) return;
    const figure = timelineFigure(tl);
    applyingView = true;
    try {
      await Plotly.react("timeline", figure.traces, figure.layout, {responsive: true, displaylogo: false});
    } finally {
      applyingView = false;
    }
    const view = document.getElementById("timeline");
    view.dataset.count = tl.count;
    view.dataset.bucketed = tl.bucketed;
    showStatus(tl.bucketed ? `frames ${tl.first} to ${tl.first + tl.count - 1}: ${tl.x.length} columns of min/max`
                           : `frames ${tl.first} to ${tl.first + tl.count - 1}, every frame`);
  }

  function moveCursor() {
    const view = document.getElementById("timeline");
    if (!view.layout || !frameValues) return;
    const shapes = (view.layout.shapes || []).slice(0, 3);
    shapes.push({type: "line", xref: "x", yref: "paper", x0: frameValues.seconds, x1: frameValues.seconds, y0: 0, y1: 1,
      line: {color: "#e91e63", width: 1.5}});
    applyingView = true;
    Plotly.relayout(view, {shapes: shapes}).finally(() => { applyingView = false; });
  }

  let relayoutTimer = null;
  function onRelayout(change) {
    if (applyingView) return;
    if (change["xaxis.autorange"]) { state.from = 0; state.to = info.duration; }
    else if (change["xaxis.range[0]"] !== undefined) { state.from = Number(change["xaxis.range[0]"]); state.to = Number(change["xaxis.range[1]"]); }
    else if (change["xaxis.range"]) { state.from = Number(change["xaxis.range"][0]); state.to = Number(change["xaxis.range"][1]); }
    else return;
    writeHash();
    clearTimeout(relayoutTimer);
    relayoutTimer = setTimeout(() => drawTimeline().catch(showError), 30);
  }

  // Surface -----------------------------------------------------------------------------------
  const SVG = "http://www.w3.org/2000/svg";
  function svgElement(name, attributes) {
    const element = document.createElementNS(SVG, name);
    for (const [key, value] of Object.entries(attributes)) element.setAttribute(key, value);
    return element;
  }

  function colourOf(value) {
    // White for nothing, deep blue for a strong normalised value (1 and above).
    const t = Math.max(0, Math.min(1, value));
    const r = Math.round(255 - 225 * t), g = Math.round(255 - 170 * t), b = Math.round(255 - 75 * t);
    return `rgb(${r},${g},${b})`;
  }

  function padsOf(letter) {
    const pixel = info.pixels.indexOf(letter);
    return info.pads.filter(p => p[0] === pixel);
  }

  function drawSurface() {
    const svg = document.getElementById("surface");
    svg.replaceChildren();
    const v = frameValues;
    const xs = info.pads.map(p => p[1]), ys = info.pads.map(p => p[2]);
    const minX = Math.min(...xs) - 2, maxX = Math.max(...xs) + 2, minY = Math.min(...ys) - 2, maxY = Math.max(...ys) + 2;
    svg.setAttribute("viewBox", `${minX} ${minY} ${maxX - minX} ${maxY - minY}`);
    for (const [region, letters] of Object.entries(info.zones)) {
      const pads = letters.split("").flatMap(padsOf);
      const px = pads.map(p => p[1]), py = pads.map(p => p[2]);
      const x0 = Math.min(...px) - 1.2, y0 = Math.min(...py) - 1.2;
      const rect = svgElement("rect", {x: x0, y: y0, width: Math.max(...px) + 1.2 - x0, height: Math.max(...py) + 1.2 - y0,
        rx: 0.6, class: "zone" + (v && v.region === Number(region) ? " active" : ""), "data-region": region});
      rect.appendChild(svgElement("title", {})).textContent = info.region_names[Number(region)];
      svg.appendChild(rect);
    }
    info.virtual_groups.forEach((group, i) => {
      const pads = group.split("").flatMap(padsOf);
      const cx = pads.reduce((s, p) => s + p[1], 0) / pads.length, cy = pads.reduce((s, p) => s + p[2], 0) / pads.length;
      const value = v ? v.virtual_normalized[i] : 0;
      const on = v ? v.virtual_on[i] : false;
      const dot = svgElement("circle", {cx: cx, cy: cy, r: 0.32, fill: colourOf(value), class: "virtual" + (on ? " on" : ""),
        "data-group": group, "data-value": v ? v.virtual_values[i] : "", "data-normalized": value, "data-on": on ? 1 : 0});
      dot.appendChild(svgElement("title", {})).textContent = `${group}: ${v ? v.virtual_values[i] : "-"} (${value})${on ? " on" : ""}`;
      svg.appendChild(dot);
    });
    info.pads.forEach(([pixel, x, y]) => {
      const letter = info.pixels[pixel];
      const value = v ? v.normalized[pixel] : 0;
      const on = v ? v.on[pixel] : false;
      const group = svgElement("g", {class: "pixel", "data-pixel": letter, "data-reading": v ? v.readings[pixel] : "",
        "data-value": v ? v.pixel_values[pixel] : "", "data-normalized": value, "data-on": on ? 1 : 0});
      group.appendChild(svgElement("circle", {cx: x, cy: y, r: 0.95, fill: colourOf(value), class: "pad" + (on ? " on" : "")}));
      const label = svgElement("text", {x: x, y: y});
      label.textContent = letter;
      group.appendChild(label);
      const reading = svgElement("text", {x: x, y: y + 0.75, style: "font-size:0.5px"});
      reading.textContent = v ? String(v.readings[pixel]) : "";
      group.appendChild(reading);
      svg.appendChild(group);
    });
  }

  // Numbers as the served page has them (four decimals); a live snapshot carries the exact floats.
  function shown(x) { return x === true ? "on" : x === false ? "-" : typeof x === "number" ? String(round(x, 4)) : x; }

  function describe(key, value) {
    if (Array.isArray(value) && value.length === info.pixels.length)
      return value.map((x, i) => `${info.pixels[i]}=${shown(x)}`).join(" ");
    if (Array.isArray(value) && value.length === info.virtual_groups.length)
      return value.map((x, i) => `${info.virtual_groups[i]}=${shown(x)}`).join(" ");
    return typeof value === "number" ? shown(value) : String(value);
  }

  function drawDetails() {
    const table = document.getElementById("details");
    table.replaceChildren();
    for (const [key, value] of Object.entries(frameValues)) {
      const row = table.insertRow();
      row.dataset.key = key;
      row.insertCell().textContent = key;
      row.insertCell().textContent = describe(key, value);
    }
  }

  async function showFrame(params) {
    const answer = await api("frame", Object.assign({set: settingsParam()}, params));
    frameValues = answer.values;
    state.frame = answer.index;
    document.getElementById("frame-number").textContent = answer.index;
    document.getElementById("frame-time").textContent =
      `(${frameValues.seconds.toFixed(3)} s, firmware frame ${frameValues.frame}, ${frameValues.transition_name})`;
    drawSurface();
    drawDetails();
    moveCursor();
    writeHash();
  }

  function stepEvent(direction) {
    if (!EXPORTED) {
      showFrame({n: state.frame, step: direction > 0 ? "next" : "previous"}).catch(showError);
      return;
    }
    const events = EXPORTED.timeline.events.filter(e => e.frame >= 0);
    const now = frameValues ? frameValues.seconds : 0;
    const candidates = direction > 0 ? events.filter(e => e.seconds > now + 1e-9) : events.filter(e => e.seconds < now - 1e-9).reverse();
    if (candidates.length) showFrame({t: candidates[0].seconds}).catch(showError);
  }

  function onKey(event) {
    if (event.target && ["INPUT", "SELECT", "TEXTAREA"].includes(event.target.tagName)) return;
    if (event.key !== "ArrowLeft" && event.key !== "ArrowRight") return;
    event.preventDefault();
    const direction = event.key === "ArrowRight" ? 1 : -1;
    if (event.shiftKey) { stepEvent(direction); return; }
    const next = Math.min(Math.max(state.frame + direction, 0), info.frames - 1);
    showFrame({n: next}).catch(showError);
  }

  // What if -----------------------------------------------------------------------------------
  function settingsMap(list) {
    const map = {};
    for (const assignment of list || []) {
      const at = assignment.indexOf("=");
      if (at < 0) continue;
      let key = assignment.slice(0, at);
      key = key.replace(/^Pipeline\./, "");
      if (!key.startsWith("Algs.")) key = "Algs." + key;
      map[key] = assignment.slice(at + 1);
    }
    return map;
  }

  function drawSettings() {
    const table = document.getElementById("settings");
    table.replaceChildren();
    const header = table.createTHead().insertRow();
    ["setting", "default", "accepted", "value"].forEach(t => { const th = document.createElement("th"); th.textContent = t; header.appendChild(th); });
    const current = settingsMap(state.settings === null ? info.settings : state.settings);
    const body = table.createTBody();
    for (const setting of info.table) {
      const row = body.insertRow();
      row.dataset.key = setting.key;
      row.title = setting.meaning;
      row.insertCell().textContent = setting.key.replace(/^Algs\./, "");
      row.insertCell().textContent = setting.default;
      row.insertCell().textContent = setting.accepted;
      const input = document.createElement("input");
      input.name = setting.key;
      input.value = current[setting.key] !== undefined ? current[setting.key] : setting.default;
      input.addEventListener("input", () => row.classList.toggle("changed", input.value !== setting.default));
      row.classList.toggle("changed", input.value !== setting.default);
      row.insertCell().appendChild(input);
    }
  }

  function chosenSettings() {
    const list = [];
    for (const setting of info.table) {
      const value = document.querySelector(`#settings input[name="${setting.key}"]`).value.trim();
      if (value !== setting.default) list.push(`${setting.key}=${value}`);
    }
    return list;
  }

  function metricsTable(before, after) {
    const table = document.createElement("table");
    table.id = "whatif-metrics";
    const rows = [["eval", "before", "after"]];
    const shown = value => value === null || value === undefined ? "-" : (typeof value === "number" ? round(value, 4) : value);
    for (const key of Object.keys(before)) rows.push([key, shown(before[key]), shown(after[key])]);
    rows.forEach((cells, i) => {
      const row = table.insertRow();
      cells.forEach(c => { const cell = document.createElement(i === 0 ? "th" : "td"); cell.textContent = c; row.appendChild(cell); });
      if (i > 0 && cells[1] !== cells[2]) row.classList.add("changed");
    });
    return table;
  }

  function eventList(title, events) {
    const block = document.createElement("div");
    const heading = document.createElement("h3");
    heading.textContent = `${title} (${events.length})`;
    heading.style.fontSize = "12px";
    block.appendChild(heading);
    const list = document.createElement("ul");
    events.slice(0, 40).forEach(e => {
      const item = document.createElement("li");
      item.textContent = `${e.seconds.toFixed(3)} s ${e.kind}${e.region ? " " + e.region : ""}`;
      item.addEventListener("click", () => showFrame({t: e.seconds}).catch(showError));
      list.appendChild(item);
    });
    block.appendChild(list);
    return block;
  }

  function drawWhatIf() {
    const box = document.getElementById("whatif-result");
    box.replaceChildren();
    if (!whatIf) return;
    const counts = document.createElement("p");
    counts.className = "counts";
    counts.innerHTML = `<span id="count-changed"></span><span id="count-added"></span><span id="count-lost"></span><span id="count-events"></span>`;
    box.appendChild(counts);
    document.getElementById("count-changed").textContent = `changed ${whatIf.changed}`;
    document.getElementById("count-added").textContent = `added ${whatIf.added}`;
    document.getElementById("count-lost").textContent = `lost ${whatIf.lost}`;
    document.getElementById("count-events").textContent = `${whatIf.events.length} events (${whatIf.opening_event_count} before)`;
    box.dataset.changed = whatIf.changed;
    box.dataset.added = whatIf.added;
    box.dataset.lost = whatIf.lost;
    box.dataset.events = JSON.stringify(whatIf.events.map(e => [e.frame, e.kind, e.region]));
    if (whatIf.summary_before && whatIf.summary_after) box.appendChild(metricsTable(whatIf.summary_before, whatIf.summary_after));
    box.appendChild(eventList("changed", whatIf.changed_events));
    box.appendChild(eventList("added", whatIf.added_events));
    box.appendChild(eventList("lost", whatIf.lost_events));
  }

  async function runWhatIf(settings) {
    const error = document.getElementById("whatif-error");
    error.textContent = "";
    try {
      const answer = await api("whatif", {set: settings});
      state.settings = settings;
      whatIf = settings.length || info.settings.length ? answer : null;
      if (whatIf && JSON.stringify(settings) === JSON.stringify(info.settings)) whatIf = null;
      writeHash();
      drawSettings();
      drawWhatIf();
      await drawTimeline();
      await showFrame({n: state.frame});
    } catch (failure) {
      error.textContent = failure.message;
    }
  }

  // Live --------------------------------------------------------------------------------------
  const LIVE_POLL_MS = 200;
  const live = {sequence: 0, series: null, timer: null, drawn: false};

  function showLiveMessage(text) {
    const message = document.getElementById("live-message");
    message.textContent = text;
    message.hidden = !text;
    document.body.dataset.liveGone = text ? "1" : "";
  }

  function appendSeries(series, now, window) {
    if (!live.series) live.series = {seconds: [], frame: [], heat: [], on: [], touch_score: [], svm_score: [], hand: [], region: []};
    for (const key of Object.keys(live.series)) live.series[key].push(...series[key]);
    let drop = 0;
    while (drop < live.series.seconds.length && live.series.seconds[drop] < now - window) drop++;
    if (drop) for (const key of Object.keys(live.series)) live.series[key].splice(0, drop);
  }

  function liveFigure(now, window) {
    const s = live.series;
    const rows = info.heat_rows;
    const column = (matrix, r) => matrix.map(values => values[r]);
    const traces = [
      {type: "heatmap", name: "readings", x: s.seconds, y: rows, z: rows.map((_, r) => column(s.heat, r)), xaxis: "x", yaxis: "y",
        colorscale: "Viridis", zmin: 0, colorbar: {len: 0.45, y: 1, yanchor: "top", thickness: 10, title: {text: "reading"}},
        hovertemplate: "%{y} %{z} at %{x:.3f} s<extra></extra>"},
      {type: "heatmap", name: "on", x: s.seconds, y: rows, z: rows.map((_, r) => column(s.on, r)), xaxis: "x", yaxis: "y2",
        zmin: 0, zmax: 1, colorscale: [[0, "#ffffff"], [1, "#00acc1"]], showscale: false},
      {type: "scatter", mode: "lines", name: "touch score", x: s.seconds, y: s.touch_score, xaxis: "x", yaxis: "y3",
        line: {color: "#1f77b4", width: 1}},
      {type: "scatter", mode: "lines", name: "classifier score", x: s.seconds, y: s.svm_score, xaxis: "x", yaxis: "y3",
        line: {color: "#999999", width: 0.7}},
      {type: "heatmap", name: "hand", x: s.seconds, y: [1], z: [s.hand], xaxis: "x", yaxis: "y4", zmin: -0.5, zmax: 3.5,
        colorscale: discreteScale(HAND_COLOURS), showscale: false, hovertemplate: "hand %{z} (1 touching, 2 holding, 3 hold suppressed)<extra></extra>"},
      {type: "heatmap", name: "active region", x: s.seconds, y: [0], z: [s.region], xaxis: "x", yaxis: "y4", zmin: -0.5, zmax: 3.5,
        colorscale: discreteScale(REGION_COLOURS), showscale: false, hovertemplate: "region %{z}<extra></extra>"},
    ];
    const layout = {
      margin: {l: 90, r: 60, t: 10, b: 35}, uirevision: "live", hovermode: "closest",
      legend: {orientation: "h", x: 0.5, y: 0.375, xanchor: "center", yanchor: "bottom", font: {size: 10}, bgcolor: "rgba(0,0,0,0)"},
      xaxis: {anchor: "y4", range: [Math.max(0, now - window), Math.max(now, window)],
        title: {text: `seconds since the viewer connected (the last ${window} s)`, standoff: 4}},
      yaxis: {domain: [0.58, 1], autorange: "reversed", type: "category", dtick: 1, tickfont: {size: 9}, title: {text: "reading by zone"}, fixedrange: true},
      yaxis2: {domain: [0.42, 0.565], autorange: "reversed", type: "category", showticklabels: false, title: {text: "on"}, fixedrange: true},
      yaxis3: {domain: [0.20, 0.37], range: [-115, 115], title: {text: "score"}, fixedrange: true},
      yaxis4: {domain: [0, 0.18], range: [-0.5, 1.5], tickvals: [0, 1], ticktext: ["active region", "hand"], tickfont: {size: 9}, fixedrange: true},
    };
    return {traces, layout};
  }

  async function pollLive() {
    let answer;
    try {
      answer = await api("live", {after: live.sequence});
    } catch (failure) {
      showLiveMessage("The viewer's server does not answer (" + failure.message + "): the page shows what it had.");
      return;
    }
    appendSeries(answer.series, answer.now, answer.window);
    live.sequence = answer.sequence;
    if (answer.latest) {
      frameValues = answer.latest;
      document.getElementById("frame-number").textContent = frameValues.frame;
      document.getElementById("frame-time").textContent =
        `(${frameValues.seconds.toFixed(3)} s, service ${frameValues.service}, ${frameValues.transition_name})`;
      document.body.dataset.frame = frameValues.frame;
      drawSurface();
      drawDetails();
    }
    await Plotly.react("timeline", ...Object.values(liveFigure(answer.now, answer.window)), {responsive: true, displaylogo: false});
    showStatus(`${live.series.seconds.length} snapshots in the last ${answer.window} s`);
    document.body.dataset.ready = "1";
    if (!answer.connected) {
      showLiveMessage(`tolkatouchd went away (${answer.message}): the page shows the last snapshots it sent.`);
      return;
    }
    live.timer = setTimeout(pollLive, LIVE_POLL_MS);
  }

  function startLive() {
    document.body.classList.add("live");
    document.title = `${info.name} - tolkatouch view`;
    document.getElementById("title").textContent = info.name;
    document.getElementById("summary").textContent = "the running service, at most 60 frames a second";
    document.querySelector("#surface-panel h2").firstChild.textContent = "Surface at firmware frame ";
    document.querySelector("#surface-panel .hint").textContent = "The newest frame the service sent; the timeline scrolls with it.";
    drawSurface();
    return pollLive();
  }

  // Start -------------------------------------------------------------------------------------
  function showError(failure) { showStatus("error: " + failure.message); }

  async function start() {
    readHash();
    // The first timeline is asked for beside the recording's description: one round trip less.
    const firstTimeline = state.settings === null && !document.body.classList.contains("live") ? fetchTimeline() : null;
    if (firstTimeline) firstTimeline.catch(() => {});
    info = await api("info", {});
    if (info.live) return startLive();
    document.title = `${info.name} - tolkatouch view`;
    document.getElementById("title").textContent = info.name;
    document.getElementById("summary").textContent =
      `${info.frames} frames, ${info.duration.toFixed(1)} s, ${info.event_count} events` +
      (info.has_labels ? `, ${info.labels.length} labels` : "") + (info.settings.length ? ` (${info.settings.join(", ")})` : "");
    if (state.from === null) state.from = 0;
    if (state.to === null) state.to = info.duration;
    state.frame = Math.min(state.frame, Math.max(info.frames - 1, 0));
    drawSettings();
    if (EXPORTED) {
      document.getElementById("whatif-run").disabled = true;
      document.getElementById("whatif-error").textContent = "What if needs the server: run tolkatouch view on the recording.";
    }
    if (state.settings !== null && !EXPORTED) {
      const answer = await api("whatif", {set: state.settings}).catch(failure => {
        document.getElementById("whatif-error").textContent = failure.message;
        state.settings = null;
        return null;
      });
      whatIf = answer && JSON.stringify(state.settings) !== JSON.stringify(info.settings) ? answer : null;
      drawSettings();
      drawWhatIf();
    }
    await drawTimeline(firstTimeline);
    await showFrame({n: state.frame});
    const view = document.getElementById("timeline");
    view.on("plotly_relayout", onRelayout);
    view.on("plotly_click", event => { if (event.points && event.points.length) showFrame({t: Number(event.points[0].x)}).catch(showError); });
    document.addEventListener("keydown", onKey);
    document.getElementById("whatif-form").addEventListener("submit", event => { event.preventDefault(); runWhatIf(chosenSettings()); });
    document.getElementById("whatif-reset").addEventListener("click", () => runWhatIf(info.settings.slice()));
    document.body.dataset.ready = "1";
  }

  start().catch(failure => { showError(failure); document.body.dataset.ready = "error"; });
})();
