// One view: a canvas with its facts. All views are drawn by one renderer, because browsers limit how many there can be.
const Views = (() => {
    const { element, format } = Charts;

    function createRenderer() {
        try {
            return new THREE.WebGLRenderer({ antialias: true, alpha: true, premultipliedAlpha: false, preserveDrawingBuffer: true });
        } catch {
            return null;
        }
    }

    function describe(view) {
        const counts = Object.entries(view.facts.counts).map(([name, count]) => `${format(count)} ${name}`);
        return `3D view of ${view.name}: ${counts.join(", ")}. Arrow keys turn, with Shift they move; plus and minus zoom, Home resets.`;
    }

    class View {
        // \param further  rows for the table of facts
        constructor(data, views, renderer, further) {
            this.data = data;
            this.renderer = renderer;
            this.canvas = element("canvas", { tabindex: "0", role: "img", "aria-label": describe(data) });
            this.geometry = new Scenes.GeometryScene(data);
            this.reference = views.find(other => other !== data && other.role === "before" && data.role === "after");
            this.element = element("article", { class: "view" }, this.heading(), element("div", { class: "stage" }, this.canvas),
                ...data.notes.map(note => element("p", { class: "note" }, note)),
                element("div", { class: "beside" },
                    element("div", {}, Charts.factsTable(data.facts, this.reference && this.reference.facts, further),
                        ...Charts.attributesTable(data.facts.properties)),
                    element("div", {}, ...Charts.histograms(data, views))));
        }

        heading() {
            const name = element("span", { class: "name", title: this.data.name }, this.data.name.split("/").pop());
            const role = this.data.role ? [element("span", { class: "role" }, this.data.role)] : [];
            return element("h2", {}, ...role, name);
        }

        // Draws into the canvas of the renderer, and copies that.
        draw() {
            const scale = Math.min(window.devicePixelRatio || 1, 2);
            const width = Math.max(1, Math.round(this.canvas.clientWidth * scale));
            const height = Math.max(1, Math.round(this.canvas.clientHeight * scale));
            if (this.canvas.width !== width || this.canvas.height !== height) {
                this.canvas.width = width;
                this.canvas.height = height;
                this.camera.setAspect(width / height);
            }
            const own = this.renderer.domElement;
            if (own.width !== width || own.height !== height)
                this.renderer.setSize(width, height, false);
            this.geometry.shared.resolution.value.set(width, height);
            this.renderer.render(this.geometry.scene, this.camera.prepare());
            const context = this.canvas.getContext("2d");
            context.clearRect(0, 0, width, height);
            context.drawImage(own, 0, 0);
        }
    }

    return { View, createRenderer };
})();
