"""Renders the first and the last view of pages to PNG files: page_pictures.py OUT_FOLDER PAGE..."""

import pathlib
import sys
import time

from selenium import webdriver
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service

PREPARE = """
    for (const element of document.querySelectorAll(".toolbar, .help, footer, header, .beside, h2, .note"))
        element.style.display = "none";
    for (const canvas of document.querySelectorAll("canvas"))
        canvas.style.height = "260px";
    document.querySelector(".views").style.gridTemplateColumns = "repeat(auto-fill, 340px)";
    const option = [...document.querySelectorAll("#color option")].find(({text}) => text.startsWith(arguments[0]));
    if (arguments[0] && option) {
        document.getElementById("color").value = option.value;
        document.getElementById("color").dispatchEvent(new Event("change"));
    }
    for (const [id, isOn] of Object.entries(arguments[1])) {
        const box = document.getElementById(id);
        if (box.type === "checkbox" ? box.checked !== isOn : true) {
            box.type === "checkbox" ? box.click() : (box.value = isOn, box.dispatchEvent(new Event("change")));
        }
    }
    setTimeout(() => document.getElementById("oblique").click(), 100);"""
# The attribute that shows what a page is about.
COLORS = {"merge": "file", "attributes": "height", "add-points": "isCylinder", "delete-points": "isCylinder"}
SWITCHES = {
    "triangulate": {"boundary": False},
    "recipe": {"boundary": False},
    "merge": {"slivers": False, "boundary": False},
    "subdivide": {"wireframe": True},
    "remove-slivers": {"slivers": True, "sliverRatio": 3},  # below 0.2
    "run": {"slivers": True, "sliverRatio": 3},
}


def main(folder, pages):
    options = Options()
    for argument in ("--headless=new", "--no-sandbox", "--use-angle=swiftshader", "--enable-unsafe-swiftshader",
                     "--window-size=1500,1000", "--hide-scrollbars"):
        options.add_argument(argument)
    driver = webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)
    for page in map(pathlib.Path, pages):
        driver.get(page.resolve().as_uri())
        while not driver.execute_script("return document.documentElement.dataset.drawn"):
            time.sleep(0.1)
        driver.execute_script(PREPARE, COLORS.get(page.stem, ""), SWITCHES.get(page.stem, {}))
        time.sleep(1.5)
        stages = driver.find_elements("class name", "stage")
        stages[0].screenshot(str(folder / f"{page.stem}-before.png"))
        stages[-1].screenshot(str(folder / f"{page.stem}-after.png"))
    driver.quit()


if __name__ == "__main__":
    main(pathlib.Path(sys.argv[1]), sys.argv[2:])
