"""Opens pages of pyramids and of `view` in a headless browser, and looks at what it shows.

browser.py PICTUREZOR          runs the tests
browser.py PICTUREZOR IMAGE    makes a screenshot of `view`
"""
import contextlib
import functools
import http.client
import http.server
import json
import os
import pathlib
import signal
import subprocess
import sys
import tempfile
import threading
import time
import unittest
import urllib.parse
import urllib.request

from selenium import webdriver
from selenium.webdriver.common.action_chains import ActionChains
from selenium.webdriver.common.by import By
from selenium.webdriver.common.keys import Keys
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.support.ui import WebDriverWait

PROGRAM = str(pathlib.Path(sys.argv[1]).resolve())
EXAMPLES = pathlib.Path(__file__).resolve().parents[2] / "examples"
WIDTH, HEIGHT = 3000, 2000
# A quarter of the picture each, and a mark that only the deepest levels show.
QUARTERS = {(0, 0): (200, 30, 30), (1, 0): (30, 180, 40), (0, 1): (20, 40, 190), (1, 1): (120, 120, 120)}
MARK, MARK_AT, MARK_SIDE = (255, 0, 255), (2101, 1301), 40


def colour_at(x, y):
    if 0 <= x - MARK_AT[0] < MARK_SIDE and 0 <= y - MARK_AT[1] < MARK_SIDE:
        return MARK
    return QUARTERS[x * 2 // WIDTH, y * 2 // HEIGHT]


def run(*arguments):
    subprocess.run([PROGRAM, *map(str, arguments), "-q"], check=True)


def write_picture(file):
    rows = []
    for y in range(HEIGHT):
        row = bytes(QUARTERS[0, y * 2 // HEIGHT]) * (WIDTH // 2) + bytes(QUARTERS[1, y * 2 // HEIGHT]) * (WIDTH // 2)
        if 0 <= y - MARK_AT[1] < MARK_SIDE:
            row = row[:3 * MARK_AT[0]] + bytes(MARK) * MARK_SIDE + row[3 * (MARK_AT[0] + MARK_SIDE):]
        rows.append(row)
    file.write_bytes(b"P6\n%d %d\n255\n" % (WIDTH, HEIGHT) + b"".join(rows))


def read_picture(file):
    """Width, height and the samples of an image file, in RGB."""
    plain = file.with_suffix(".read.ppm")
    run("convert", file, "-o", plain)
    with open(plain, "rb") as stream:
        words = []
        while len(words) < 4:
            words += stream.readline().split()
        width, height = int(words[1]), int(words[2])
        return width, height, stream.read()


def new_browser():
    options = webdriver.ChromeOptions()
    for argument in ("--headless=new", "--no-sandbox", "--disable-dev-shm-usage", "--window-size=1000,700",
                     "--force-device-scale-factor=1", "--force-color-profile=srgb"):
        options.add_argument(argument)
    options.binary_location = "/usr/bin/chromium"
    browser = webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)
    browser.set_script_timeout(20)
    return browser


def wait(browser, script, seconds=20):
    WebDriverWait(browser, seconds, poll_frequency=0.05).until(lambda b: b.execute_script("return " + script))


LOADED = "window.viewer && viewer.world.getItemCount() == 1 && viewer.world.getItemAt(0).getFullyLoaded()"


def look_at(browser, x, y, side):
    """Fills the viewer with a square of the picture around a pixel, at once."""
    browser.execute_script(
        "const item = viewer.world.getItemAt(0), [x, y, side] = arguments;"
        "viewer.viewport.fitBounds(item.imageToViewportRectangle(x - side / 2, y - side / 2, side, side), true)",
        x, y, side)
    time.sleep(0.1)
    wait(browser, LOADED)


@contextlib.contextmanager
def served(folder):
    class Quiet(http.server.SimpleHTTPRequestHandler):
        def log_message(self, *_):
            pass
    server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), functools.partial(Quiet, directory=str(folder)))
    threading.Thread(target=server.serve_forever, daemon=True).start()
    yield f"http://127.0.0.1:{server.server_port}/"
    server.shutdown()
    server.server_close()


@contextlib.contextmanager
def viewing(*names, temporary=None, folder=None):
    environment = dict(os.environ, TMPDIR=str(temporary)) if temporary else None
    process = subprocess.Popen([PROGRAM, "view", "--no-open", *map(str, names)], stdout=subprocess.PIPE,
                               text=True, env=environment, cwd=folder)
    try:
        yield process.stdout.readline().strip(), process
    finally:
        process.kill()
        process.wait()
        process.stdout.close()


class Browser(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.browser = new_browser()
        cls.addClassCleanup(cls.browser.quit)
        folder = tempfile.TemporaryDirectory()
        cls.addClassCleanup(folder.cleanup)
        cls.folder = pathlib.Path(folder.name)
        write_picture(cls.folder / "plain.ppm")

    def pixel(self, x=None, y=None):
        """The colour that the browser shows at a place in the viewer, its middle without one."""
        shot = self.folder / "shot.png"
        self.browser.save_screenshot(str(shot))
        width, _, samples = read_picture(shot)
        box = self.browser.execute_script(
            "const b = document.getElementById('viewer').getBoundingClientRect(); return [b.x, b.y, b.width, b.height]")
        x = box[0] + (box[2] / 2 if x is None else x)
        y = box[1] + (box[3] / 2 if y is None else y)
        at = 3 * (int(y) * width + int(x))
        return tuple(samples[at:at + 3])

    def assert_shows(self, expected):
        shown = self.pixel()
        self.assertLessEqual(max(abs(a - b) for a, b in zip(shown, expected)), 1, f"{shown} is not {expected}")

    def assert_deepest(self):
        """The tiles of the picture itself are what is shown."""
        self.assertTrue(self.browser.execute_script(
            "const item = viewer.world.getItemAt(0);"
            "return Object.keys(item.coverage).map(Number).includes(item.source.maxLevel)"))

    def test_static_pages(self):
        for layout, page in (("deepzoom", "deepzoom.html"), ("iiif", "iiif/index.html"), ("xyz", "xyz/index.html")):
            with self.subTest(layout):
                run("tiles", self.folder / "plain.ppm", "--layout", layout, "--format", "png", "--page",
                    "-o", self.folder / layout)
        with served(self.folder) as address:
            for page in ("deepzoom.html", "iiif/index.html", "xyz/index.html"):
                with self.subTest(page):
                    self.browser.get(address + page)
                    wait(self.browser, LOADED)
                    for x, y in ((750, 500), (2250, 500), (750, 1500), (2700, 1800)):
                        look_at(self.browser, x, y, 300)
                        self.assert_shows(colour_at(x, y))
                    look_at(self.browser, MARK_AT[0] + 20, MARK_AT[1] + 20, 60)
                    self.assert_shows(MARK)
                    self.assert_deepest()
                    before = self.browser.execute_script("return viewer.viewport.getZoom()")
                    self.browser.find_element(By.CSS_SELECTOR, ".openseadragon-canvas").send_keys("-")
                    wait(self.browser, f"viewer.viewport.getZoom() < {before}")
                    self.assertTrue(self.browser.execute_script(
                        "return viewer.navigator.element.isConnected && viewer.fullPageButton.element.isConnected"))
                    # The picture has no resolution.
                    self.assertEqual(self.browser.find_elements(By.CSS_SELECTOR, ".scale-bar"), [])

    def test_scale_bar_tells_the_resolution(self):
        photo = bytearray((EXAMPLES / "lake.jpg").read_bytes())
        self.assertEqual(photo[6:11], b"JFIF\0")
        photo[13:18] = bytes([1, 1, 44, 1, 44])  # 300 pixels of an inch
        (self.folder / "lake.jpg").write_bytes(photo)
        run("tiles", self.folder / "lake.jpg", "--page", "-o", self.folder / "lake")
        with served(self.folder) as address:
            self.browser.get(address + "lake.html")
            wait(self.browser, LOADED)
            bar = self.browser.find_element(By.CSS_SELECTOR, ".scale-bar")
            number, unit = bar.text.split()
            metres = float(number) * {"m": 1, "cm": 1e-2, "mm": 1e-3, "\u00b5m": 1e-6}[unit]
            screen = self.browser.execute_script(
                "return viewer.viewport.viewportToImageZoom(viewer.viewport.getZoom(true))")
            self.assertAlmostEqual(bar.size["width"], metres * 300 / 0.0254 * screen, delta=1)

    def test_view(self):
        run("convert", self.folder / "plain.ppm", "-o", self.folder / "a.tif")
        run("convert", self.folder / "plain.ppm", "-o", self.folder / "b.png")
        (self.folder / "broken.tif").write_bytes((self.folder / "a.tif").read_bytes()[:40])
        names = [self.folder / name for name in ("a.tif", "b.png", "broken.tif")]
        with viewing(*names) as (address, _):
            self.browser.get(address)
            for number in range(2):
                wait(self.browser, "document.querySelectorAll('#strip button').length == 3")
                self.browser.find_elements(By.CSS_SELECTOR, "#strip button")[number].click()
                wait(self.browser, "document.getElementById('progress').hidden && " + LOADED)
                look_at(self.browser, 750, 1500, 300)
                self.assert_shows(colour_at(750, 1500))
                look_at(self.browser, MARK_AT[0] + 20, MARK_AT[1] + 20, 60)
                self.assert_shows(MARK)
                self.assert_deepest()
            self.look_under_the_pointer()
            self.move_a_slider()
            self.select_and_save(address)
            self.browser.find_elements(By.CSS_SELECTOR, "#strip button")[2].click()
            wait(self.browser, "!document.getElementById('message').hidden")
            self.assertIn("broken.tif", self.browser.find_element(By.ID, "message").text)

    def look_under_the_pointer(self):
        viewer = self.browser.find_element(By.ID, "viewer")
        ActionChains(self.browser).move_to_element(viewer).perform()
        wait(self.browser, "document.getElementById('pixel').textContent.endsWith(': 255 0 255')")

    def move_a_slider(self):
        look_at(self.browser, 2700, 1800, 300)
        slider = self.browser.find_element(By.NAME, "gamma")
        slider.send_keys(Keys.ARROW_RIGHT * 10)
        wait(self.browser, "document.getElementById('command').value.includes('--gamma 1.5')")
        wait(self.browser, LOADED)
        run("crop", self.folder / "plain.ppm", "--rect", "2700,1800,1,1", "-o", self.folder / "pixel.ppm")
        run("filter", "gamma", self.folder / "pixel.ppm", "--gamma", "1.5", "-o", self.folder / "gamma.ppm")
        expected = tuple(read_picture(self.folder / "gamma.ppm")[2])
        self.assertGreater(expected[0], 130)
        self.assert_shows(expected)

    def select_and_save(self, address):
        self.browser.find_element(By.CSS_SELECTOR, "button[type=reset]").click()
        wait(self.browser, "document.getElementById('command').hidden")
        self.browser.find_element(By.ID, "select").click()
        viewer = self.browser.find_element(By.ID, "viewer")
        ActionChains(self.browser).move_to_element_with_offset(viewer, -50, -40).click_and_hold() \
            .move_by_offset(70, 30).move_by_offset(30, 20).release().perform()
        wait(self.browser, "!document.getElementById('save').hidden")
        command = self.browser.find_element(By.ID, "command").get_attribute("value")
        rectangle = command.split("--rect ")[1].split()[0]
        x, y, width, height = map(int, rectangle.split(","))
        self.assertTrue(abs(x + width / 2 - 2700) < 30 and abs(y + height / 2 - 1800) < 30, command)
        saved = self.folder / "saved.png"
        link = self.browser.find_element(By.ID, "save").get_attribute("href")
        saved.write_bytes(urllib.request.urlopen(link).read())
        run("crop", self.folder / "b.png", "--rect", rectangle, "-o", self.folder / "cut.png")
        self.assertEqual(read_picture(saved), read_picture(self.folder / "cut.png"))

    def test_requests_from_elsewhere_are_refused(self):
        (self.folder / "secret.txt").write_text("secret")
        with viewing(self.folder / "plain.ppm") as (address, _):
            place = urllib.parse.urlsplit(address)

            def status(path, host=place.netloc, body=None):
                connection = http.client.HTTPConnection(place.hostname, place.port, timeout=20)
                connection.putrequest("POST" if body else "GET", path, skip_host=True)
                connection.putheader("Host", host)
                if body:
                    connection.putheader("Content-Length", str(len(body)))
                connection.endheaders(body)
                answer = connection.getresponse()
                content = answer.read()
                connection.close()
                return answer.status, content

            self.assertEqual(status("/")[0], 200)
            self.assertEqual(status("/", "example.org")[0], 403)
            self.assertEqual(status("/", f"example.org:{place.port}")[0], 403)
            for path in ("/secret.txt", "/../secret.txt", "/openseadragon/../../secret.txt",
                         "/openseadragon/%2e%2e/%2e%2e/secret.txt", f"/openseadragon/{self.folder}/secret.txt",
                         "/etc/passwd", "/pictures/1", "/pictures/0/tile/99/0/0", "/pictures/0/tile/3/99/0"):
                with self.subTest(path):
                    code, content = status(path)
                    self.assertEqual(code, 404)
                    self.assertNotIn(b"secret", content)
            for path in ("/pictures/0/tile/3/-1/0", "/pictures/0/pixel?x=5000&y=1", "/pictures/0/pixel?x=nan&y=1",
                         "/pictures/0/part?x=0&y=0&width=9000&height=1", "/pictures/0/tile/3/0/0?gamma=0",
                         "/pictures/99999999999999999999"):
                with self.subTest(path):
                    self.assertIn(status(path)[0], (400, 404))
            self.assertGreaterEqual(status("/" + "x" * 20000)[0], 400)
            with contextlib.suppress(ConnectionError):
                self.assertGreaterEqual(status("/", body=b"x" * 100000)[0], 400)
            self.assertEqual(status("/")[0], 200)

    def test_smaller_copies_in_a_file_are_shown(self):
        for more, made in (([], True), (["--pyramid"], False)):
            run("convert", self.folder / "plain.ppm", "--tile", 128, *more, "-o", self.folder / "levels.tif")
            with self.subTest(more), viewing(self.folder / "levels.tif") as (address, process):
                while not json.load(urllib.request.urlopen(address + "pictures/0/state"))["done"]:
                    time.sleep(0.01)
                mapped = pathlib.Path(f"/proc/{process.pid}/maps").read_text().splitlines()
                nameless = [at for at in mapped if tempfile.gettempdir() in at and at.endswith("(deleted)")]
                self.assertEqual(bool(nameless), made)
                self.assertEqual(urllib.request.urlopen(address + "pictures/0/tile/1/0/0").status, 200)

    def test_an_ended_server_leaves_nothing(self):
        # Not read in parts, so a pyramid is made in temporary files.
        run("scale", self.folder / "plain.ppm", "--width", 6000, "--fast", "-o", self.folder / "large.png")
        for end in (signal.SIGINT, signal.SIGKILL):
            with self.subTest(end), tempfile.TemporaryDirectory() as temporary:
                before = set(os.listdir(self.folder))
                with viewing(self.folder / "large.png", temporary=temporary) as (address, process):
                    state = address + "pictures/0/state"
                    while json.load(urllib.request.urlopen(state))["rows"] == 0:
                        time.sleep(0.01)
                    self.assertFalse(json.load(urllib.request.urlopen(state))["done"])
                    process.send_signal(end)
                    self.assertEqual(process.wait(timeout=20), -end)
                    self.assertEqual(os.listdir(temporary), [])
                self.assertEqual(set(os.listdir(self.folder)), before)


def screenshot(file):
    browser = new_browser()
    browser.set_window_size(1100, 800)
    with viewing("lake.jpg", "badge.png", folder=EXAMPLES) as (address, _):
        browser.get(address)
        wait(browser, "document.querySelectorAll('#strip button img').length == 2")
        wait(browser, "document.getElementById('progress').hidden && " + LOADED)
        browser.find_element(By.NAME, "gamma").send_keys(Keys.ARROW_RIGHT * 6)
        wait(browser, "!document.getElementById('command').hidden")
        browser.find_element(By.ID, "select").click()
        viewer = browser.find_element(By.ID, "viewer")
        ActionChains(browser).move_to_element_with_offset(viewer, -150, -90).click_and_hold() \
            .move_by_offset(150, 100).move_by_offset(120, 90).release().perform()
        wait(browser, "!document.getElementById('save').hidden && " + LOADED)
        time.sleep(0.5)
        with tempfile.TemporaryDirectory() as shots:
            shot = pathlib.Path(shots) / "shot.png"
            browser.save_screenshot(str(shot))
            run("convert", shot, "-o", file)
    browser.quit()


if __name__ == "__main__":
    if len(sys.argv) > 2:
        screenshot(sys.argv[2])
    else:
        unittest.main(argv=sys.argv[:1])
