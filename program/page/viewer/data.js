// The geometry and attributes in the page.
const Data = (() => {
    const kMostCategories = Colors.categoryCount; // distinct integers that are shown as categories
    const kTextureWidth = 4096;

    const page = JSON.parse(document.getElementById("data").textContent);

    function decode(text) {
        if (Uint8Array.fromBase64)
            return Uint8Array.fromBase64(text);
        const binary = atob(text);
        const bytes = new Uint8Array(binary.length);
        for (let i = 0; i < bytes.length; ++i)
            bytes[i] = binary.charCodeAt(i);
        return bytes;
    }

    // The typed array of a block. Its text stays in the page only if it `isKept`.
    function read(array, isKept = false) {
        const types = { Float32: Float32Array, Float64: Float64Array, Int8: Int8Array, Uint8: Uint8Array,
            Int16: Int16Array, Uint16: Uint16Array, Int32: Int32Array, Uint32: Uint32Array,
            BigInt64: BigInt64Array, BigUint64: BigUint64Array };
        const element = document.getElementById(array.block);
        const values = new types[array.type](decode(element.textContent).buffer);
        if (!isKept)
            element.remove();
        return values;
    }

    // Rows of a texture with so many texels, of four or fewer channels.
    function textureRows(count) {
        return Math.max(1, Math.ceil(count / kTextureWidth));
    }

    // How an attribute can be shown: "x", "y", ... of vectors, their length, or as colors.
    function channelsOf(attribute) {
        const { components, type } = attribute.array;
        if (components === 1)
            return [""];
        const isColor = (components === 3 || components === 4) && /colou?r|rgb|diffuse|albedo/i.test(attribute.name);
        const names = components <= 4 ? ["x", "y", "z", "w"] : [...Array(components).keys()].map(String);
        const own = [...names.slice(0, components), "length"];
        return isColor && !type.startsWith("Big") && !type.includes("Int32") ? ["color", ...own] : own;
    }

    // One number per element. 64-bit integers lose what doubles cannot hold.
    function numbersOf(attribute, channel) {
        const values = read(attribute.array, true);
        const n = attribute.array.components;
        const numbers = new Float64Array(values.length / n);
        const at = n === 1 ? 0 : "xyzw".includes(channel) ? "xyzw".indexOf(channel) : Number(channel);
        for (let i = 0; i < numbers.length; ++i) {
            if (channel !== "length") {
                numbers[i] = Number(values[i * n + at]);
                continue;
            }
            let sum = 0;
            for (let c = 0; c < n; ++c)
                sum += Number(values[i * n + c]) ** 2;
            numbers[i] = Math.sqrt(sum);
        }
        return numbers;
    }

    // Four bytes per element of a color.
    function bytesOfColor(attribute) {
        const values = read(attribute.array, true);
        const { components: n, type } = attribute.array;
        const scale = type.startsWith("Float") ? 255 : type.endsWith("16") ? 255 / 65535 : 1;
        const bytes = new Uint8ClampedArray(values.length / n * 4);
        for (let i = 0; i < bytes.length / 4; ++i) {
            for (let c = 0; c < 3; ++c)
                bytes[4 * i + c] = values[n * i + c] * scale;
            bytes[4 * i + 3] = 255;
        }
        return bytes;
    }

    function rangeOf(numbers) {
        let least = Infinity;
        let most = -Infinity;
        for (const number of numbers)
            if (Number.isFinite(number)) {
                least = number < least ? number : least;
                most = number > most ? number : most;
            }
        return { least, most };
    }

    // The sorted distinct values if there are few and all of them are integers; otherwise null.
    function categoriesOf(attribute, numbers) {
        if (attribute.texts)
            return attribute.texts.map((_, i) => i);
        if (attribute.array.components !== 1 || attribute.array.type.startsWith("Float"))
            return null;
        const distinct = new Set();
        for (const number of numbers) {
            distinct.add(number);
            if (distinct.size > kMostCategories)
                return null;
        }
        return [...distinct].sort((a, b) => a - b);
    }

    return { page, read, textureRows, textureWidth: kTextureWidth, channelsOf, numbersOf, bytesOfColor, rangeOf, categoriesOf };
})();
