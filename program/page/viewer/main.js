// The page: a heading, the controls, and the views.
(() => {
    const { element, format } = Charts;
    const { page } = Data;
    const kWireframeUpTo = 60000; // faces; above that, edges hide the shape

    const root = document.getElementById("page");
    const renderer = Views.createRenderer();
    const views = [];
    // For scripts that look at the page: how often it was drawn, and whether it will be once more.
    const state = document.documentElement.dataset;

    function drawSoon() {
        if (state.planned || !renderer)
            return;
        state.planned = "true";
        requestAnimationFrame(() => {
            delete state.planned;
            for (const view of views)
                view.draw();
            state.drawn = String(Number(state.drawn || 0) + 1);
        });
    }

    // What can be chosen as color: attributes that several views have are one choice.
    function choicesOf() {
        const choices = new Map();
        const add = (key, choice, view, attribute) => {
            if (!choices.has(key))
                choices.set(key, { ...choice, attributes: new Map() });
            choices.get(key).attributes.set(view, attribute);
        };
        for (const view of views) {
            if (view.geometry.qualities)
                add("quality", { label: "Face quality (shortest over longest edge)", channel: "quality" }, view, null);
            for (const attribute of view.data.attributes)
                for (const channel of Data.channelsOf(attribute)) {
                    const label = `${attribute.name}${channel && channel !== "color" ? " " + channel : ""} (${attribute.of})`;
                    add(JSON.stringify([attribute.of, attribute.name, channel]), { label, channel }, view, attribute);
                }
        }
        return [...choices.values()];
    }

    const shorten = text => text.length > 60 ? text.slice(0, 57) + "…" : text;

    function valuesOf(choice, view) {
        const attribute = choice.attributes.get(view);
        if (choice.channel === "quality")
            return { of: "faces", numbers: view.geometry.qualities, categories: null };
        const numbers = Data.numbersOf(attribute, choice.channel);
        return { of: attribute.of, numbers, categories: Data.categoriesOf(attribute, numbers), texts: attribute.texts };
    }

    // From 0 to 1, and -1 for values that are not finite.
    function scaled(numbers, { least, most }) {
        const span = most - least;
        return Float32Array.from(numbers, value => !Number.isFinite(value) ? -1 : span > 0 ? (value - least) / span : 0.5);
    }

    function showLegend(content) {
        document.getElementById("legend").replaceChildren(...content);
    }

    function showRange(label, { least, most }) {
        if (least > most) {
            showLegend([element("span", {}, "no finite value")]);
            return;
        }
        const bar = element("span", { class: "bar", role: "img", "aria-label": `${label}: dark for ${least}, light for ${most}` });
        bar.style.background = Colors.gradient;
        showLegend([element("span", { class: "least" }, format(least)), bar, element("span", { class: "most" }, format(most))]);
    }

    function showCategories(names) {
        const shown = names.slice(0, 12).map((name, i) => {
            const swatch = element("span", { class: "swatch" });
            swatch.style.background = Colors.category(i);
            return element("span", { class: "category", title: name }, swatch, shorten(name || "(none)"));
        });
        showLegend([...shown, ...names.length > 12 ? [element("span", {}, `and ${names.length - 12} more`)] : []]);
    }

    function colorBy(choice) {
        if (!choice || choice.channel === "color") {
            for (const view of views) {
                const attribute = choice && choice.attributes.get(view);
                view.geometry.show(attribute ? { mode: 3, of: attribute.of, values: Data.bytesOfColor(attribute) } : { mode: 0 });
            }
            showLegend([]);
            return;
        }
        const values = new Map(views.filter(view => choice.attributes.has(view)).map(view => [view, valuesOf(choice, view)]));
        const lists = [...values.values()];
        const texts = [...new Set(lists.flatMap(value => value.texts || []))];
        const numbers = [...new Set(lists.flatMap(value => value.categories || []))].sort((a, b) => a - b);
        const isCategorical = lists.every(value => value.categories);
        const ranges = lists.map(value => Data.rangeOf(value.numbers));
        const range = choice.channel === "quality" ? { least: 0, most: 1 }
            : { least: Math.min(...ranges.map(r => r.least)), most: Math.max(...ranges.map(r => r.most)) };
        for (const view of views) {
            const value = values.get(view);
            if (!value)
                view.geometry.show({ mode: 0 });
            else if (isCategorical) {
                const index = value.texts ? value.texts.map(text => texts.indexOf(text)) : null;
                view.geometry.show({ mode: 2, of: value.of,
                    values: Float32Array.from(value.numbers, n => (index ? index[n] : numbers.indexOf(n)) % 256 / 255) });
            } else
                view.geometry.show({ mode: 1, of: value.of, values: scaled(value.numbers, range) });
        }
        if (isCategorical)
            showCategories(texts.length ? texts : numbers.map(String));
        else
            showRange(choice.label, range);
    }

    function checkbox(id, label, isChecked, onChange, color) {
        const input = element("input", { type: "checkbox", id });
        input.checked = isChecked;
        input.addEventListener("change", () => {
            onChange(input.checked);
            drawSoon();
        });
        onChange(isChecked);
        const swatch = element("span", { class: "swatch" });
        if (color)
            swatch.style.background = color;
        return element("label", { for: id }, input, ...color ? [swatch] : [], label);
    }

    function select(id, label, options, onChange) {
        const list = element("select", { id }, ...options.map(([text], i) => element("option", { value: i, title: text }, shorten(text))));
        list.addEventListener("change", () => {
            onChange(options[list.value][1]);
            drawSoon();
        });
        return element("label", { for: id }, label, list);
    }

    const forAll = act => value => views.forEach(view => act(view.geometry, value));

    function highlightControls() {
        const meshes = views.filter(view => view.geometry.qualities);
        if (!meshes.length)
            return [];
        const has = name => meshes.some(({ data }) => data.facts.topology[name] > 0);
        let ratio = 0.1;
        let isShown = has("sliversBelow0.1");
        const showSlivers = () => forAll((geometry, value) => geometry.showSlivers(value))(isShown ? ratio : 0);
        const controls = [];
        if (has("openEdges"))
            controls.push(checkbox("boundary", "Boundary edges", true,
                forAll((geometry, value) => geometry.showHighlight("boundary", value)), Colors.highlight("boundary")));
        if (has("nonManifoldEdges"))
            controls.push(checkbox("nonManifold", "Non-manifold edges", true,
                forAll((geometry, value) => geometry.showHighlight("nonManifold", value)), Colors.highlight("nonManifold")));
        controls.push(checkbox("slivers", "Slivers", isShown, value => {
            isShown = value;
            showSlivers();
        }, Colors.highlight("sliver")));
        controls.push(select("sliverRatio", "below", [["0.1", 0.1], ["0.01", 0.01], ["0.05", 0.05], ["0.2", 0.2], ["0.3", 0.3]], value => {
            ratio = value;
            showSlivers();
        }));
        return controls;
    }

    let areLinked = true;
    let isFollowing = false;

    // What one camera does, the others do.
    function follow(leader) {
        if (areLinked && !isFollowing) {
            isFollowing = true;
            for (const { camera } of views)
                if (camera && camera !== leader)
                    camera.pose = leader.pose;
            isFollowing = false;
        }
        drawSoon();
    }

    function lookButtons() {
        const button = (side, label) => {
            const result = element("button", { type: "button", id: side }, label);
            result.addEventListener("click", () => {
                for (const { camera } of views)
                    camera.look(side);
                drawSoon();
            });
            return result;
        };
        return element("div", { class: "buttons", role: "group", "aria-label": "Look from" },
            button("oblique", "Reset"), button("front", "Front"), button("right", "Right"), button("top", "Top"));
    }

    function toolbar() {
        const choices = choicesOf();
        const faceCount = Math.max(0, ...views.map(({ geometry }) => geometry.qualities ? geometry.qualities.length : 0));
        const colors = select("color", "Color", [["One color", null], ...choices.map(choice => [choice.label, choice])], colorBy);
        const legend = element("div", { id: "legend", "aria-live": "polite" });
        const wireframe = faceCount ? [checkbox("wireframe", "Wireframe", faceCount <= kWireframeUpTo,
            forAll((geometry, value) => geometry.showEdges(value)))] : [];
        const link = views.length > 1 ? [checkbox("link", "Link views", true, value => {
            areLinked = value;
        })] : [];
        return element("section", { class: "toolbar", "aria-label": "What the views show" },
            element("div", { class: "coloring" }, colors, legend),
            element("div", { class: "switches" }, ...wireframe, ...highlightControls(), ...link), lookButtons());
    }

    // What an operation did, as its report says.
    function runSection(run) {
        if (!run)
            return [];
        const facts = [];
        if (run.seconds !== undefined)
            facts.push(["operation", Charts.formatSeconds(run.seconds)]);
        if (run.phaseSeconds)
            facts.push(["all with files", Charts.formatSeconds(run.phaseSeconds.total)]);
        if (run.peakMemoryBytes)
            facts.push(["peak memory", Charts.formatBytes(run.peakMemoryBytes)]);
        return [element("section", { class: "run", "aria-label": "What was run" },
            element("pre", {}, element("code", {}, run.commandLine)),
            element("dl", {}, ...facts.flatMap(([name, value]) => [element("dt", {}, name), element("dd", {}, value)])),
            ...(run.notes || []).map(text => element("p", { class: "note" }, text)),
            ...(run.warnings || []).map(text => element("p", { class: "note" }, "Warning: " + text)))];
    }

    // What the report says of the geometry before or after, beyond its facts. Of several inputs it has sums only.
    function rowsOfReport({ role, facts }) {
        const isOnly = page.views.filter(view => view.role === role).length === 1;
        const known = { ...facts.counts, ...facts.topology };
        const rows = page.run && isOnly && page.run[role] || {};
        return Object.fromEntries(Object.entries(rows).filter(([name, value]) => !(name in known) && value !== null));
    }

    function build() {
        document.title = shorten(page.title);
        for (const data of page.views)
            views.push(new Views.View(data, page.views, renderer, rowsOfReport(data)));
        const frames = Cameras.framesOf(views.map(view => view.geometry.box),
            views.length === 2 && page.views[1].role === "after");
        views.forEach((view, i) => {
            view.camera = new Cameras.Camera(view.canvas, frames[i], follow);
        });
        const help = element("p", { class: "help" }, "Drag to turn, right-drag or two fingers to move, wheel or pinch to zoom. "
            + "Keys: arrows turn, Shift and arrows move, + and − zoom, Home resets.");
        const failure = renderer ? [] : [element("p", { class: "note" },
            "This browser has no WebGL 2, so there are no pictures; the facts are below.")];
        root.replaceChildren(element("header", {}, element("h1", { title: page.title }, page.title), ...runSection(page.run)), ...failure, toolbar(),
            element("div", { class: views.length > 2 ? "views many" : "views" }, ...views.map(view => view.element)), help,
            element("footer", {}, `Made by modeling ${page.version}. Drawn by three.js, © three.js authors, MIT license.`));
        const observer = new ResizeObserver(drawSoon);
        for (const view of views)
            observer.observe(view.canvas);
        window.addEventListener("beforeprint", () => views.forEach(view => renderer && view.draw()));
        document.addEventListener("keydown", event => {
            const control = document.getElementById("wireframe");
            if (event.key === "w" && control && event.target.tagName !== "SELECT" && !event.ctrlKey && !event.metaKey)
                control.click();
        });
        drawSoon();
    }

    // After the text "Loading" has appeared.
    setTimeout(build, 20);
})();
