// Texts, tables and histograms beside the views.
const Charts = (() => {
    const kSvg = "http://www.w3.org/2000/svg";
    const kWidth = 300;
    const kHeight = 84;

    // An element with attributes and children. Texts are never parsed as HTML.
    function element(name, attributes = {}, ...children) {
        const result = document.createElement(name);
        for (const [key, value] of Object.entries(attributes))
            result.setAttribute(key, value);
        result.append(...children);
        return result;
    }

    function svg(name, attributes, ...children) {
        const result = document.createElementNS(kSvg, name);
        for (const [key, value] of Object.entries(attributes))
            result.setAttribute(key, value);
        result.append(...children);
        return result;
    }

    // "openEdges" becomes "open edges".
    const words = key => key.replace(/(?<=[a-z])[A-Z0-9]/g, letter => " " + letter.toLowerCase());

    function format(value) {
        if (value === null || value === undefined)
            return "–";
        if (typeof value === "boolean")
            return value ? "yes" : "no";
        if (typeof value !== "number")
            return String(value);
        if (Number.isInteger(value) && Math.abs(value) < 1e15)
            return value.toLocaleString("en-US");
        return Number(value.toPrecision(4)).toString();
    }

    const formatSeconds = s => s >= 1 ? `${s.toFixed(2)} s` : s >= 1e-3 ? `${(s * 1e3).toFixed(1)} ms` : `${(s * 1e6).toFixed(0)} µs`;
    const formatBytes = b => b >= 1e9 ? `${(b / 1e9).toFixed(1)} GB` : `${(b / 1e6).toFixed(1)} MB`;

    function rowsOf(values, reference) {
        return Object.entries(values).map(([key, value]) => {
            const cell = element("td", {}, format(value));
            if (reference && key in reference && reference[key] !== value)
                cell.className = "changed";
            return element("tr", {}, element("th", { scope: "row" }, words(key)), cell);
        });
    }

    // The facts of a view, and further rows of a report. Those that differ from the reference stand out.
    function factsTable({ counts, topology, boundingBox }, reference, further = {}) {
        const box = boundingBox && { "box from": boundingBox.min.map(format).join(", "), "box to": boundingBox.max.map(format).join(", ") };
        return element("table", { class: "facts" }, element("tbody", {},
            ...rowsOf({ ...counts, ...topology, ...further, ...box }, reference && { ...reference.counts, ...reference.topology })));
    }

    function path(heights, isClosed) {
        const step = kWidth / heights.length;
        let d = `M0 ${kHeight}`;
        heights.forEach((height, i) => {
            const y = (kHeight * (1 - height)).toFixed(2);
            d += `L${(i * step).toFixed(2)} ${y}L${((i + 1) * step).toFixed(2)} ${y}`;
        });
        return d + `L${kWidth} ${kHeight}` + (isClosed ? "Z" : "");
    }

    const share = bins => {
        const total = bins.reduce((sum, n) => sum + n, 0) || 1;
        return bins.map(n => n / total);
    };

    // \param before  the bins of another view to compare with, or null
    function histogram(title, bins, before, ends, color) {
        const own = share(bins);
        const other = before && share(before);
        const most = Math.max(...own, ...other || [0]) || 1;
        const scaled = shares => shares.map(value => value / most * 0.96);
        const chart = svg("svg", { viewBox: `0 0 ${kWidth} ${kHeight + 1}`, preserveAspectRatio: "none", role: "img",
            "aria-label": `${title}, from ${ends[0]} to ${ends[1]}` },
            svg("path", { d: path(scaled(own), true), class: "bars", fill: color || "currentColor" }));
        if (other)
            chart.append(svg("path", { d: path(scaled(other), false), class: "before" }));
        chart.append(svg("line", { x1: 0, x2: kWidth, y1: kHeight, y2: kHeight, class: "axis" }));
        const legend = other ? [element("span", { class: "key" }, "line: before")] : [];
        return element("figure", { class: "histogram" }, element("figcaption", {}, title, ...legend), chart,
            element("div", { class: "ends" }, element("span", {}, ends[0]), element("span", {}, ends[1])));
    }

    // The lengths of edges on a logarithmic scale that views share.
    function edgeLengths(view, views, before) {
        const exponents = views.flatMap(v => v.histograms ? v.histograms.edgeLengths.map(([at]) => at) : []);
        if (!exponents.length)
            return [];
        const least = Math.min(...exponents) - 1;
        const most = Math.max(...exponents) + 1;
        const binsOf = ({ histograms }) => {
            const bins = Array(most - least + 1).fill(0);
            for (const [at, count] of histograms.edgeLengths)
                bins[at - least] = count;
            return bins;
        };
        const length = at => format(Number((2 ** (at / view.histograms.binsPerOctave)).toPrecision(3)));
        return [histogram("Edge lengths (logarithmic)", binsOf(view), before && binsOf(before), [length(least), length(most + 1)])];
    }

    function histograms(view, views) {
        if (!view.histograms)
            return [];
        const before = view.role === "after" ? views.find(other => other.role === "before" && other.histograms) : null;
        return [
            ...edgeLengths(view, views, before),
            histogram("Face quality (shortest / longest edge)", view.histograms.qualities,
                before && before.histograms.qualities, ["0", "1"]),
        ];
    }

    function attributesTable(properties) {
        const own = properties.filter(property => !property.standard);
        if (!own.length)
            return [];
        const rows = own.map(({ name, type, component }) =>
            element("tr", {}, element("th", { scope: "row", title: name }, name), element("td", {}, `${type} of ${component}`)));
        return [element("details", {}, element("summary", {}, own.length === 1 ? "1 attribute" : `${own.length} attributes`),
            element("table", { class: "facts" }, element("tbody", {}, ...rows)))];
    }

    return { element, format, words, formatSeconds, formatBytes, factsTable, histograms, attributesTable };
})();
