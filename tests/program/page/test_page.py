"""Opens pages in a real browser, without a display, and looks at what it draws."""

import base64
import os
import pathlib
import subprocess
import time
import urllib.parse

import numpy
import pytest
from selenium import webdriver
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.support.ui import Select

PROGRAM = os.environ["MODELING_PROGRAM"]
SAMPLES = pathlib.Path(os.environ["MODELING_SAMPLES"])
BOUNDARY, SLIVER = (0xD5, 0x5E, 0x00), (0xCC, 0x4F, 0xA0)
VIRIDIS_ENDS = (0x44, 0x01, 0x54), (0xFD, 0xE7, 0x25)


@pytest.fixture(scope="module")
def driver():
    options = Options()
    for argument in ("--headless=new", "--no-sandbox", "--use-angle=swiftshader", "--enable-unsafe-swiftshader",
                     "--enable-precise-memory-info", "--disable-dev-shm-usage", "--window-size=1000,900"):
        options.add_argument(argument)
    options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
    result = webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)
    result.set_page_load_timeout(90)
    yield result
    result.quit()


class Page:
    """An open page. At the end it must have written no console message and made no request."""

    def __init__(self, driver, file):
        self.driver = driver
        driver.get("file://" + urllib.parse.quote(str(file)))
        self.wait_until_drawn(None)

    def run(self, script, *arguments):
        return self.driver.execute_script(script, *arguments)

    def wait(self, condition, seconds=60):
        end = time.monotonic() + seconds
        while not condition():
            assert time.monotonic() < end, self.driver.get_log("browser")
            time.sleep(0.02)

    def act(self, action):
        """Does something that makes the views be drawn again."""
        drawn = self.drawn()
        action()
        self.wait_until_drawn(drawn)

    def drawn(self):
        """How often the views were drawn, or None."""
        return self.run("return document.documentElement.dataset.drawn")

    def wait_until_drawn(self, before):
        """Waits for a drawing with nothing planned after it: a new size may draw the views between a count and an action."""
        self.wait(lambda: self.drawn() != before and not self.run("return document.documentElement.dataset.planned"))

    def click(self, name):
        self.act(lambda: self.run("document.getElementById(arguments[0]).click()", name))

    def color_by(self, text):
        select = Select(self.driver.find_element("id", "color"))
        label = next(option.text for option in select.options if option.text.startswith(text))
        self.act(lambda: select.select_by_visible_text(label))

    def legend(self):
        return self.driver.find_element("id", "legend").text.split()

    def image(self, view=0):
        """The pixels of a view as red, green, blue and alpha."""
        width, height, data = self.run("""
            const {width, height} = document.querySelectorAll("canvas")[arguments[0]];
            const copy = Object.assign(document.createElement("canvas"), {width, height});
            const context = copy.getContext("2d", {willReadFrequently: true});
            context.drawImage(document.querySelectorAll("canvas")[arguments[0]], 0, 0);
            const {data} = context.getImageData(0, 0, width, height);
            let text = "";
            for (let i = 0; i < data.length; i += 32768)
                text += String.fromCharCode(...data.subarray(i, i + 32768));
            return [width, height, btoa(text)];""", view)
        return numpy.frombuffer(base64.b64decode(data), numpy.uint8).reshape(height, width, 4).astype(int)

    def close(self):
        assert self.driver.get_log("browser") == []
        assert self.run("return performance.getEntriesByType('resource').length") == 0


@pytest.fixture
def open_page(driver, tmp_path):
    pages = []

    def open_files(*arguments):
        file = tmp_path / "page.html"
        subprocess.run([PROGRAM, *map(str, arguments[:1]), file, *map(str, arguments[1:]), "--force", "-q"], check=True)
        pages.append(Page(driver, file))
        return pages[-1]

    yield open_files
    pages[-1].close()


def covered(image):
    return (image[..., 3] > 128).mean()


def near(image, color, tolerance=30):
    """How many pixels have about the hue of a color, however it is lit."""
    ratio = image[..., :3] / numpy.maximum(image[..., :3].max(axis=-1, keepdims=True), 1)
    wanted = numpy.array(color) / max(color)
    return int(((abs(ratio - wanted).max(axis=-1) < tolerance / 255) & (image[..., 3] > 128)).sum())


def write_ply(path, points, faces, columns=()):
    names = "".join(f"property float {name}\n" for name, _ in columns)
    head = (f"ply\nformat binary_little_endian 1.0\nelement vertex {len(points)}\nproperty float x\nproperty float y\n"
            f"property float z\n{names}element face {len(faces)}\nproperty list uchar int vertex_indices\nend_header\n")
    rows = numpy.column_stack([points, *(values for _, values in columns)]).astype("<f4")
    lists = numpy.zeros(len(faces), [("n", "u1"), ("points", "<i4", faces.shape[1])])
    lists["n"], lists["points"] = faces.shape[1], faces
    path.write_bytes(head.encode() + rows.tobytes() + lists.tobytes())


def write_grid(path, n, columns=lambda x, y: (), shift=0):
    """A square of n by n quads, each cut into two triangles, from -1 to 1, moved along x."""
    x, y = (axis.ravel() for axis in numpy.meshgrid(numpy.linspace(-1, 1, n + 1), numpy.linspace(-1, 1, n + 1)))
    first = (numpy.arange(n)[:, None] * (n + 1) + numpy.arange(n)).ravel()
    faces = numpy.concatenate([numpy.column_stack([first, first + 1, first + n + 2]),
                               numpy.column_stack([first, first + n + 2, first + n + 1])])
    write_ply(path, numpy.column_stack([x + shift, y, 0.1 * x * x]), faces, columns(x, y))


def test_views_draw_the_model_where_it_is(open_page, tmp_path):
    write_grid(tmp_path / "square.ply", 8)
    page = open_page("page", tmp_path / "square.ply")
    page.click("front")
    image = page.image()
    height, width, _ = image.shape
    red, green, blue, alpha = image[height // 2 - 2, width // 2 + 3]
    assert alpha == 255 and red >= green >= blue > 60  # clay
    assert image[5, 5, 3] == 0  # beside the square
    front = covered(image)
    page.click("right")
    edge_on = page.image()
    assert 0 < covered(edge_on) < front / 4
    assert edge_on[height // 2, width // 5, 3] == 0


def test_colors_are_those_of_the_attribute(open_page, tmp_path):
    def columns(x, y):
        height = 5 + 2.5 * x
        return ("height", height), ("gaps", numpy.where(y > 0, numpy.nan, x))
    write_grid(tmp_path / "square.ply", 16, columns)
    page = open_page("page", tmp_path / "square.ply")
    page.click("wireframe")
    page.click("front")
    page.color_by("height")
    assert page.legend() == ["2.5", "7.5"]
    image = page.image()
    height, width, _ = image.shape
    opaque = numpy.flatnonzero(image[height // 2, :, 3] == 255)
    for column, color in zip((opaque[6], opaque[-7]), VIRIDIS_ENDS):
        assert near(image[height // 2 : height // 2 + 1, column : column + 1], color, 60) == 1, image[height // 2, column]
    page.color_by("gaps")
    assert page.legend() == ["-1", "1"]
    middle = page.image()[height // 2 - 40, width // 2]
    assert max(middle[:3]) - min(middle[:3]) < 12  # gray: no value
    page.color_by("Face quality")
    assert page.legend() == ["0", "1"]


def test_switches(open_page):
    page = open_page("page", SAMPLES / "spider.obj", SAMPLES / "spider.obj")
    for switch, color in (("boundary", BOUNDARY), ("slivers", SLIVER)):
        shown = near(page.image(), color)
        page.click(switch)
        assert shown > 60 and near(page.image(), color) < shown / 20, switch
    with_edges = page.image()[..., :3].sum()
    page.click("wireframe")
    assert page.image()[..., :3].sum() > with_edges * 1.02  # edges are dark

    def press(key):
        page.act(lambda: page.driver.find_elements("css selector", "canvas")[0].send_keys(key))
    before = page.image(1)
    press("\ue014")  # right
    assert (page.image(0) == page.image(1)).all() and (page.image(1) != before).any()
    page.run("document.getElementById('link').click()")
    before = page.image(1)
    press("+")
    assert (page.image(1) == before).all() and covered(page.image(0)) > covered(before)


def test_kinds_of_geometry(open_page, tmp_path):
    (tmp_path / "points.xyz").write_text("".join(f"{i % 20} {i // 20} 0\n" for i in range(400)))
    page = open_page("page", SAMPLES / "keyhole.obj", SAMPLES / "stitch-quad-rings.obj", tmp_path / "points.xyz",
                     SAMPLES / "mixed.obj")
    page.click("oblique")
    assert all(covered(page.image(view)) > 0.005 for view in range(4))
    for width in (400, 1600):
        page.act(lambda: page.driver.set_window_size(width, 900))
        assert page.run("return document.scrollingElement.scrollWidth <= window.innerWidth"), width
    page.driver.set_window_size(1000, 900)


def test_hostile_names_and_values_are_harmless(open_page, tmp_path):
    attack = "</script><script>document.body.innerHTML='';console.error(1)</script><!--\"'&äöü\u2028"
    file = tmp_path / "<img src=x onerror=alert(1)> \"'ü.obj"
    file.write_text(f"o {attack.replace(chr(0x2028), '')}\nv 0 0 0\nv 1 0 0\nv 0 1 0\nf 1 2 3\ng {'x' * 10000}\nf 1 3 2\n")
    title = attack + "y" * 10000
    page = open_page("page", file, "--title", title)
    assert page.run("return document.querySelector('h1').textContent") == title
    assert page.run("return document.querySelector('.name').title") == str(file)
    assert page.run("return document.images.length + document.scripts.length - document.querySelectorAll('[type]').length") <= 1
    page.color_by("group")
    assert page.run("return document.querySelector('.category').title || document.querySelectorAll('.category')[1].title") == "x" * 10000
    assert page.run("return document.scrollingElement.scrollWidth <= window.innerWidth")


def test_two_million_faces_open(open_page, tmp_path):
    write_grid(tmp_path / "large.ply", 1000, lambda x, y: [("height", x * y)])
    start = time.monotonic()
    page = open_page("page", tmp_path / "large.ply")
    page.click("front")
    assert covered(page.image()) > 0.05
    page.color_by("height")
    assert page.legend() == ["-1", "1"]
    assert page.run("return performance.memory.usedJSHeapSize") < 700e6
    assert not page.driver.find_elements("class name", "note")  # nothing is left out
    print(f"{time.monotonic() - start:.1f} s")


def test_before_and_after(driver, tmp_path):
    out, file = tmp_path / "merged.ply", tmp_path / "run.html"
    write_grid(tmp_path / "left.ply", 4)
    write_grid(tmp_path / "right.ply", 4, shift=2.5)
    command = [PROGRAM, "merge", tmp_path / "left.ply", tmp_path / "right.ply", "-o", out, "--source-attribute", "from",
               "--page", file, "-q"]
    subprocess.run(command, check=True)
    page = Page(driver, file)
    assert [role.text for role in page.driver.find_elements("class name", "role")] == ["before", "before", "after"]
    assert page.run("return document.querySelector('.run code').textContent").startswith("modeling merge ")
    page.color_by("from (faces)")
    assert page.legend() == ["0", "1"] and len(page.driver.find_elements("class name", "category")) == 2
    blue, orange = (near(page.image(2), color, 40) for color in ((0x00, 0x72, 0xB2), (0xE6, 0x9F, 0x00)))
    assert blue > 500 and 0.5 < orange / blue < 2
    assert page.driver.find_elements("css selector", ".changed")  # counts after that differ from those before
    page.close()
