// What one view draws.
const Scenes = (() => {
    const kPlain = Colors.unit("#e3dccf");
    const kPlainStrand = Colors.unit("#5b83a8");

    function textureOf(data, format, type, count) {
        const rows = Data.textureRows(count);
        const texture = new THREE.DataTexture(data, Data.textureWidth, rows, format, type);
        texture.magFilter = texture.minFilter = THREE.NearestFilter;
        texture.needsUpdate = true;
        return texture;
    }

    // Room for whole rows of a texture.
    const room = (Type, channels, count) => new Type(channels * Data.textureWidth * Data.textureRows(count));

    function unsignedTexture(data, count) {
        const texture = textureOf(data, THREE.RGBAIntegerFormat, THREE.UnsignedIntType, count);
        texture.internalFormat = "RGBA32UI";
        return texture;
    }

    function numberTexture(numbers, count) {
        const data = room(Float32Array, 1, count);
        data.set(numbers);
        return textureOf(data, THREE.RedFormat, THREE.FloatType, count);
    }

    function tableTexture(table) {
        const texture = new THREE.DataTexture(table, 256, 1, THREE.RGBAFormat, THREE.UnsignedByteType);
        texture.needsUpdate = true;
        return texture;
    }

    const tables = { map: tableTexture(Colors.viridisTable()), categories: tableTexture(Colors.categoryTable()) };
    const nothing = numberTexture([-1], 1);

    // Four numbers per point, with the box of those that are finite.
    function padPositions(positions) {
        const count = positions.length / 3;
        const padded = room(Float32Array, 4, count);
        const box = { min: [Infinity, Infinity, Infinity], max: [-Infinity, -Infinity, -Infinity] };
        for (let i = 0; i < count; ++i)
            for (let c = 0; c < 3; ++c) {
                const value = positions[3 * i + c];
                padded[4 * i + c] = value;
                if (!Number.isFinite(value))
                    continue;
                if (value < box.min[c])
                    box.min[c] = value;
                if (value > box.max[c])
                    box.max[c] = value;
            }
        return { count, padded, box };
    }

    function object(shader, vertexCount, uniforms, Kind = THREE.Mesh, options = {}) {
        const geometry = new THREE.BufferGeometry();
        geometry.setDrawRange(0, vertexCount);
        const material = new THREE.RawShaderMaterial({ glslVersion: THREE.GLSL3, vertexShader: shader.vertex,
            fragmentShader: shader.fragment, side: THREE.DoubleSide, uniforms, ...options });
        const result = new Kind(geometry, material);
        result.frustumCulled = false; // there is no box, because there are no attributes
        return result;
    }

    // Three points per triangle, and its face with a bit for each side that is an edge of the face.
    function readTriangles(arrays) {
        const cornerPoints = Data.read(arrays.cornerPoints);
        const corners = arrays.triangles ? Data.read(arrays.triangles) : null;
        const offsets = arrays.offsets ? Data.read(arrays.offsets) : null;
        const count = (corners || cornerPoints).length / 3;
        const packed = room(Uint32Array, 4, count);
        let face = 0;
        for (let t = 0; t < count; ++t) {
            let edges = 7;
            if (corners) {
                const c = [corners[3 * t], corners[3 * t + 1], corners[3 * t + 2]];
                while (offsets[face + 1] <= c[0])
                    ++face;
                const size = offsets[face + 1] - offsets[face];
                edges = 0;
                for (let k = 0; k < 3; ++k) {
                    const step = Math.abs(c[k] - c[(k + 1) % 3]);
                    if (step === 1 || step === size - 1)
                        edges |= 1 << k;
                }
            }
            for (let k = 0; k < 3; ++k)
                packed[4 * t + k] = cornerPoints[corners ? corners[3 * t + k] : 3 * t + k];
            packed[4 * t + 3] = (corners ? face : t) | edges << 29;
        }
        return { count, packed, corners, cornerPoints, offsets };
    }

    // The shortest over the longest edge of each face, and the points of the longest one.
    function measureFaces(mesh, positions) {
        const { cornerPoints, offsets, corners } = mesh;
        const count = corners ? offsets.length - 1 : mesh.count;
        const qualities = new Float32Array(count);
        const longestEdges = new Uint32Array(2 * count);
        for (let face = 0; face < count; ++face) {
            const first = corners ? offsets[face] : 3 * face;
            const end = corners ? offsets[face + 1] : first + 3;
            let shortest = Infinity;
            let longest = 0;
            for (let i = first, before = end - 1; i < end; before = i++) {
                const a = 4 * cornerPoints[before];
                const b = 4 * cornerPoints[i];
                const square = (positions[a] - positions[b]) ** 2 + (positions[a + 1] - positions[b + 1]) ** 2
                    + (positions[a + 2] - positions[b + 2]) ** 2;
                shortest = square < shortest ? square : shortest;
                if (square > longest) {
                    longest = square;
                    longestEdges[2 * face] = cornerPoints[before];
                    longestEdges[2 * face + 1] = cornerPoints[i];
                }
            }
            qualities[face] = longest > 0 ? Math.sqrt(shortest / longest) : 0;
        }
        return { qualities, longestEdges };
    }

    // Two points per segment, as texels with a third number.
    function packSegments(pairs, thirdOf = () => 0) {
        const count = pairs.length / 2;
        const packed = room(Uint32Array, 4, count);
        for (let i = 0; i < count; ++i)
            packed.set([pairs[2 * i], pairs[2 * i + 1], thirdOf(i)], 4 * i);
        return { count, texture: unsignedTexture(packed, count) };
    }

    class GeometryScene {
        constructor(view) {
            this.scene = new THREE.Scene();
            this.kind = view.kind;
            const { count, padded, box } = padPositions(Data.read(view.arrays.positions));
            this.pointCount = count;
            this.positions = padded;
            this.box = box;
            this.shared = { positions: { value: textureOf(padded, THREE.RGBAFormat, THREE.FloatType, count) },
                values: { value: nothing }, valuesOf: { value: 0 }, colors: { value: tables.map }, mode: { value: 0 },
                plainColor: { value: view.kind === "mesh" ? kPlain : kPlainStrand },
                resolution: { value: new THREE.Vector2(1, 1) } };
            this.highlights = {};
            if (this.kind === "mesh")
                this.addMesh(view.arrays);
            else if (this.kind === "strands")
                this.addStrands(view.arrays);
            else if (count)
                this.scene.add(object(Shaders.points, count, { ...this.shared, radius: { value: this.spacing() } },
                    THREE.Points));
        }

        get diagonal() {
            const { min, max } = this.box;
            const length = Math.hypot(max[0] - min[0], max[1] - min[1], max[2] - min[2]);
            return Number.isFinite(length) ? length : 0;
        }

        // About the distance between points of a surface.
        spacing() {
            return 0.35 * this.diagonal / Math.sqrt(Math.max(1, this.pointCount));
        }

        addMesh(arrays) {
            const mesh = readTriangles(arrays);
            const { qualities, longestEdges } = measureFaces(mesh, this.positions);
            this.triangleCorners = mesh.corners;
            this.qualities = qualities;
            this.longestEdges = longestEdges;
            const triangles = unsignedTexture(mesh.packed, mesh.count);
            this.faces = { ...this.shared, triangles: { value: triangles },
                qualities: { value: numberTexture(qualities, qualities.length) }, showsEdges: { value: false },
                sliverRatio: { value: 0 }, sliverColor: { value: Colors.unit(Colors.highlight("sliver")) } };
            if (mesh.count)
                this.scene.add(object(Shaders.mesh, 3 * mesh.count, this.faces));
            for (const name of ["boundary", "nonManifold"])
                this.highlights[name] = this.addLines(Data.read(arrays[name + "Edges"]), Colors.highlight(name));
        }

        addStrands(arrays) {
            const offsets = Data.read(arrays.offsets);
            const pairs = [];
            const strands = [];
            for (let strand = 0; strand + 1 < offsets.length; ++strand)
                for (let point = offsets[strand]; point + 1 < offsets[strand + 1]; ++point) {
                    pairs.push(point, point + 1);
                    strands.push(strand);
                }
            if (!strands.length)
                return;
            const { count, texture } = packSegments(pairs, i => strands[i]);
            // A tenth of the mean distance of parallel strands that fill the side of the box.
            const radius = Math.min(this.diagonal / 250, 0.35 * this.diagonal / Math.sqrt(offsets.length - 1) / 3);
            this.scene.add(object(Shaders.segments, 6 * count, { ...this.shared, ends: { value: texture },
                pixels: { value: 0 }, radius: { value: radius }, opacity: { value: 1 } }));
        }

        // Lines of constant width, faint where faces hide them.
        addLines(pairs, color) {
            const { count, texture } = packSegments(pairs);
            const uniforms = { ...this.shared, ends: { value: texture }, pixels: { value: 3 }, radius: { value: 0 },
                mode: { value: 0 }, plainColor: { value: Colors.unit(color) } };
            const lines = [
                object(Shaders.segments, 6 * count, { ...uniforms, opacity: { value: 1 } }),
                object(Shaders.segments, 6 * count, { ...uniforms, opacity: { value: 0.2 } }, THREE.Mesh,
                    { depthTest: false, depthWrite: false, transparent: true }),
            ];
            if (count)
                this.scene.add(...lines);
            return lines;
        }

        // \param ratio  0 to show none
        showSlivers(ratio) {
            if (!this.faces)
                return;
            this.faces.sliverRatio.value = ratio;
            for (const lines of this.highlights.slivers || []) {
                this.scene.remove(lines);
                lines.material.uniforms.ends.value.dispose();
                lines.material.dispose();
            }
            const pairs = []; // slivers can be narrower than a pixel
            for (let face = 0; face < this.qualities.length && pairs.length < 400000; ++face)
                if (this.qualities[face] < ratio)
                    pairs.push(this.longestEdges[2 * face], this.longestEdges[2 * face + 1]);
            this.highlights.slivers = this.addLines(pairs, Colors.highlight("sliver"));
        }

        showHighlight(name, isShown) {
            for (const lines of this.highlights[name] || [])
                lines.visible = isShown;
        }

        showEdges(isShown) {
            if (this.faces)
                this.faces.showsEdges.value = isShown;
        }

        // \param coloring  "plain", or {mode, of, numbers | bytes}: what to map to colors, from 0 to 1
        show(coloring) {
            if (this.shared.values.value !== nothing)
                this.shared.values.value.dispose();
            this.shared.values.value = nothing;
            this.shared.mode.value = coloring.mode;
            if (coloring.mode === 0)
                return;
            this.shared.valuesOf.value = ["points", "corners"].includes(coloring.of)
                ? ["points", "corners"].indexOf(coloring.of) : 2;
            this.shared.colors.value = coloring.mode === 2 ? tables.categories : tables.map;
            let { values } = coloring;
            const channels = coloring.mode === 3 ? 4 : 1;
            if (coloring.of === "corners" && this.triangleCorners)
                values = this.gatherCorners(values, channels);
            if (coloring.mode === 3) {
                const count = values.length / 4;
                const data = room(Uint8Array, 4, count);
                data.set(values);
                this.shared.values.value = textureOf(data, THREE.RGBAFormat, THREE.UnsignedByteType, count);
            } else
                this.shared.values.value = numberTexture(values, values.length);
        }

        gatherCorners(values, channels) {
            const corners = this.triangleCorners;
            const result = new values.constructor(channels * corners.length);
            for (let i = 0; i < corners.length; ++i)
                for (let c = 0; c < channels; ++c)
                    result[channels * i + c] = values[channels * corners[i] + c];
            return result;
        }
    }

    return { GeometryScene };
})();
