// Arrays are textures, and a vertex finds its elements by its number: nothing is stored once per corner, which would need
// several times the memory.
const Shaders = (() => {
    const kCommon = `
        precision highp float;
        precision highp int;
        precision highp sampler2D;
        precision highp usampler2D;
    `;
    const kVertex = kCommon + `
        uniform mat4 modelViewMatrix;
        uniform mat4 projectionMatrix;
        uniform sampler2D positions;
        uniform sampler2D values; // numbers from 0 to 1 (negative for none), or colors
        uniform int valuesOf; // 0: points, 1: corners, 2: faces or strands
        ivec2 texel(int i) { return ivec2(i % ${Data.textureWidth}, i / ${Data.textureWidth}); }
        vec3 positionOf(int point) { return texelFetch(positions, texel(point), 0).xyz; }
        vec4 valueOf(int element) { return texelFetch(values, texel(element), 0); }
    `;
    const kFragment = kCommon + `
        uniform sampler2D colors; // 256 steps
        uniform int mode; // 0: one color, 1: color map, 2: categories, 3: colors
        uniform vec3 plainColor;
        const vec3 kNoValue = vec3(0.62);
        out vec4 fragment;
        vec3 colorOf(vec4 smoothValue, vec4 flatValue) {
            if (mode == 0) return plainColor;
            if (mode == 3) return smoothValue.rgb;
            float value = mode == 2 ? flatValue.r : smoothValue.r;
            if (!(value >= -0.001)) return kNoValue;
            return texelFetch(colors, ivec2(int(clamp(value, 0.0, 1.0) * 255.0 + 0.5), 0), 0).rgb;
        }
        // A key light from the upper left and a weaker one from the right; data is lit softly, so that its colors last.
        vec3 lit(vec3 color, vec3 normal) {
            float key = max(dot(normal, normalize(vec3(-0.45, 0.65, 0.75))), 0.0);
            float fill = max(dot(normal, normalize(vec3(0.8, -0.1, 0.5))), 0.0);
            float rim = pow(1.0 - clamp(normal.z, 0.0, 1.0), 3.0);
            float ambient = mode == 0 ? 0.42 : 0.6;
            return color * (ambient + (1.0 - ambient) * (0.78 * key + 0.28 * fill) + 0.06) + 0.05 * rim;
        }
    `;

    const mesh = {
        vertex: kVertex + `
            uniform usampler2D triangles; // three points; the face, and above it which sides are edges of the face
            uniform sampler2D qualities;
            out vec3 place;
            out vec4 value;
            out vec3 barycentric;
            flat out vec4 flatValue;
            flat out uint edges;
            flat out float quality;
            void main() {
                int triangle = gl_VertexID / 3, k = gl_VertexID % 3;
                uvec4 corners = texelFetch(triangles, texel(triangle), 0);
                int point = int(k == 0 ? corners.x : k == 1 ? corners.y : corners.z);
                int face = int(corners.w & 0x1fffffffu);
                vec4 own = valueOf(valuesOf == 0 ? point : valuesOf == 1 ? gl_VertexID : face);
                value = own;
                flatValue = own;
                edges = corners.w >> 29;
                quality = texelFetch(qualities, texel(face), 0).r;
                barycentric = vec3(k == 0, k == 1, k == 2);
                vec4 seen = modelViewMatrix * vec4(positionOf(point), 1.0);
                place = seen.xyz;
                gl_Position = projectionMatrix * seen;
            }
        `,
        fragment: kFragment + `
            uniform bool showsEdges;
            uniform float sliverRatio; // 0 if slivers are not shown
            uniform vec3 sliverColor;
            in vec3 place;
            in vec4 value;
            in vec3 barycentric;
            flat in vec4 flatValue;
            flat in uint edges;
            flat in float quality;
            void main() {
                vec3 normal = normalize(cross(dFdx(place), dFdy(place)));
                vec3 color = colorOf(value, flatValue);
                if (mode == 0 && !gl_FrontFacing) color *= vec3(0.80, 0.62, 0.58); // the inside
                if (quality < sliverRatio) color = sliverColor;
                color = lit(color, normal.z < 0.0 ? -normal : normal);
                if (showsEdges) {
                    vec3 width = fwidth(barycentric);
                    vec3 off = smoothstep(width * 0.1, width * 1.0, barycentric);
                    float line = 1.0 - min(min((edges & 2u) != 0u ? off.x : 1.0, (edges & 4u) != 0u ? off.y : 1.0),
                        (edges & 1u) != 0u ? off.z : 1.0);
                    float widest = max(width.x, max(width.y, width.z));
                    color = mix(color, vec3(0.08, 0.1, 0.13), line * 0.62 * (1.0 - 0.9 * smoothstep(0.12, 0.6, widest)));
                }
                fragment = vec4(color, 1.0);
            }
        `,
    };

    // Segments as rectangles that face the camera: of constant width for highlights, shaded as tubes for strands.
    const segments = {
        vertex: kVertex + `
            uniform usampler2D ends; // two points; the strand
            uniform vec2 resolution;
            uniform float pixels; // the width of a line, or 0 for tubes
            uniform float radius; // of tubes
            out vec4 value;
            flat out vec4 flatValue;
            out float across;
            out vec3 side;
            out vec3 place;
            vec4 clipOf(vec3 p) { return projectionMatrix * vec4(p, 1.0); }
            void main() {
                int segment = gl_VertexID / 6, k = gl_VertexID % 6;
                bool isSecond = k == 1 || k == 2 || k == 4;
                across = k == 0 || k == 1 || k == 3 ? -1.0 : 1.0;
                uvec3 points = texelFetch(ends, texel(segment), 0).xyz;
                vec4 own = valueOf(valuesOf == 0 ? int(isSecond ? points.y : points.x) : int(points.z));
                value = own;
                flatValue = own;
                vec3 a = (modelViewMatrix * vec4(positionOf(int(points.x)), 1.0)).xyz;
                vec3 b = (modelViewMatrix * vec4(positionOf(int(points.y)), 1.0)).xyz;
                vec3 here = isSecond ? b : a;
                vec3 along = b - a;
                side = vec3(0.0);
                place = here;
                if (pixels == 0.0) {
                    side = cross(along, here);
                    side /= max(length(side), 1e-30);
                    vec3 onward = along / max(length(along), 1e-30) * radius * 0.4 * (isSecond ? 1.0 : -1.0);
                    gl_Position = clipOf(here + side * across * radius + onward);
                    return;
                }
                gl_Position = clipOf(here * 0.9985); // in front of the faces
                vec4 first = clipOf(a), second = clipOf(b);
                vec2 onScreen = (second.xy / max(second.w, 1e-6) - first.xy / max(first.w, 1e-6)) * resolution;
                vec2 normal = length(onScreen) > 0.0 ? normalize(vec2(-onScreen.y, onScreen.x)) : vec2(0.0);
                gl_Position.xy += normal * across * pixels / resolution * gl_Position.w;
            }
        `,
        fragment: kFragment + `
            uniform float pixels;
            uniform float opacity;
            in vec4 value;
            flat in vec4 flatValue;
            in float across;
            in vec3 side;
            in vec3 place;
            void main() {
                vec3 color = colorOf(value, flatValue);
                if (pixels == 0.0) {
                    vec3 toward = normalize(-place);
                    color = lit(color, normalize(side * across + toward * sqrt(max(0.0, 1.0 - across * across))));
                }
                fragment = vec4(color, opacity);
            }
        `,
    };

    // Points as shaded balls.
    const points = {
        vertex: kVertex + `
            uniform vec2 resolution;
            uniform float radius;
            out vec4 value;
            void main() {
                value = valueOf(gl_VertexID);
                gl_Position = projectionMatrix * modelViewMatrix * vec4(positionOf(gl_VertexID), 1.0);
                gl_PointSize = clamp(radius * projectionMatrix[1][1] * resolution.y / gl_Position.w, 2.0, 32.0);
            }
        `,
        fragment: kFragment + `
            in vec4 value;
            void main() {
                vec2 at = gl_PointCoord * 2.0 - 1.0;
                float square = dot(at, at);
                if (square > 1.0) discard;
                fragment = vec4(lit(colorOf(value, value), vec3(at.x, -at.y, sqrt(1.0 - square))), 1.0);
            }
        `,
    };

    return { mesh, segments, points };
})();
