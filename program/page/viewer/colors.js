"use strict";

// Color maps that are distinct for color-blind people, and even to the eye.
const Colors = (() => {
    // 16 even steps of viridis, by Stéfan van der Walt and Nathaniel Smith (CC0).
    const kViridis = ["440154", "481a6c", "472f7d", "414487", "39568c", "31688e", "2a788e", "23888e",
        "1f988b", "22a884", "35b779", "54c568", "7ad151", "a5db36", "d2e21b", "fde725"];
    // After Okabe and Ito, "Color universal design".
    const kCategories = ["0072b2", "e69f00", "009e73", "cc79a7", "56b4e9", "d55e00", "f0e442", "999999"];
    const kHighlights = { boundary: "d55e00", nonManifold: "0072b2", sliver: "cc4fa0" };

    const channels = hex => [0, 2, 4].map(at => parseInt(hex.slice(at, at + 2), 16));

    // Four bytes for each of 256 steps.
    function viridisTable() {
        const stops = kViridis.map(channels);
        const table = new Uint8Array(4 * 256);
        for (let i = 0; i < 256; ++i) {
            const at = i / 255 * (stops.length - 1);
            const lower = Math.min(Math.floor(at), stops.length - 2);
            for (let c = 0; c < 3; ++c)
                table[4 * i + c] = Math.round(stops[lower][c] + (at - lower) * (stops[lower + 1][c] - stops[lower][c]));
            table[4 * i + 3] = 255;
        }
        return table;
    }

    // The same for categories, which repeat their colors after eight.
    function categoryTable() {
        const table = new Uint8Array(4 * 256);
        for (let i = 0; i < 256; ++i)
            table.set([...channels(kCategories[i % kCategories.length]), 255], 4 * i);
        return table;
    }

    return {
        viridisTable,
        categoryTable,
        gradient: `linear-gradient(to right, ${kViridis.map(hex => "#" + hex).join(", ")})`,
        category: i => "#" + kCategories[i % kCategories.length],
        categoryCount: kCategories.length,
        highlight: name => "#" + kHighlights[name],
        unit: css => channels(css.slice(1)).map(value => value / 255),
    };
})();
