"""The same work by several libraries of Python's, as a table: the best of some runs each, in milliseconds.

The argument is the program of calls.cpp, for the cost of short calls beside that from C++ on.
"""

import io
import os
import pathlib
import platform
import subprocess
import sys
import time

import numpy as np
import picturezor as pz

try:
    import cv2
except ImportError:
    cv2 = None
try:
    from PIL import Image, ImageFilter, ImageOps
except ImportError:
    Image = None
try:
    import pyvips
except ImportError:
    pyvips = None

LAKE = pathlib.Path(__file__).resolve().parents[2] / "examples" / "lake.jpg"
RUNS, SECONDS = 9, 1.5


def best(work):
    """Seconds of the fastest run."""
    times = []
    while len(times) < 3 or (len(times) < RUNS and sum(times) < SECONDS):
        start = time.perf_counter()
        work()
        times.append(time.perf_counter() - start)
    return min(times)


def rows():
    """What is done, and how each library does it; a library without the work is left out."""
    picture = pz.open(LAKE).scale(width=4000, height=3000)
    array = picture.to_array()
    mask = pz.from_array(np.ascontiguousarray(array[:, :, 0]))
    jpeg, png = picture.encode("jpg", quality=90), picture.encode("png", level=1)
    table = np.array([round(255 * (at / 255) ** (1 / 2.2)) for at in range(256)], np.uint8)
    image = Image and picture.to_pil()
    pil_mask = Image and mask.to_pil()
    vips = pyvips and pyvips.Image.new_from_memory(array.tobytes(), 4000, 3000, 3, "uchar")
    stream = lambda **options: image.save(io.BytesIO(), **options)
    yield "read JPEG", {
        "picturezor": lambda: pz.open(jpeg), "Pillow": lambda: Image.open(io.BytesIO(jpeg)).load(),
        "OpenCV": lambda: cv2.imdecode(np.frombuffer(jpeg, np.uint8), cv2.IMREAD_COLOR),
        "pyvips": lambda: pyvips.Image.new_from_buffer(jpeg, "").write_to_memory()}
    yield "write JPEG, quality 90, full colour", {
        "picturezor": lambda: picture.encode("jpg", quality=90),
        "Pillow": lambda: stream(format="JPEG", quality=90, subsampling=0),
        "pyvips": lambda: vips.jpegsave_buffer(Q=90, subsample_mode="off")}
    yield "read PNG", {
        "picturezor": lambda: pz.open(png), "Pillow": lambda: Image.open(io.BytesIO(png)).load(),
        "OpenCV": lambda: cv2.imdecode(np.frombuffer(png, np.uint8), cv2.IMREAD_COLOR),
        "pyvips": lambda: pyvips.Image.new_from_buffer(png, "").write_to_memory()}
    yield "write PNG, level 1", {
        "picturezor": lambda: picture.encode("png", level=1), "Pillow": lambda: stream(format="PNG", compress_level=1),
        "OpenCV": lambda: cv2.imencode(".png", array, [cv2.IMWRITE_PNG_COMPRESSION, 1]),
        "pyvips": lambda: vips.pngsave_buffer(compression=1)}
    yield "a third, Lanczos 3", {
        "picturezor": lambda: picture.scale(width=1333, height=1000),
        "Pillow": lambda: image.resize((1333, 1000), Image.LANCZOS),
        "pyvips": lambda: vips.resize(1 / 3, kernel="lanczos3").write_to_memory()}
    yield "a quarter, mean", {
        "picturezor": lambda: picture.scale(width=1000, height=750, kernel="box"),
        "Pillow": lambda: image.resize((1000, 750), Image.BOX),
        "OpenCV": lambda: cv2.resize(array, (1000, 750), interpolation=cv2.INTER_AREA),
        "pyvips": lambda: vips.shrink(4, 4).write_to_memory()}
    yield "twice, cubic", {
        "picturezor": lambda: picture.scale(percent=200, kernel="poly3"),
        "Pillow": lambda: image.resize((8000, 6000), Image.BICUBIC),
        "OpenCV": lambda: cv2.resize(array, (8000, 6000), interpolation=cv2.INTER_CUBIC),
        "pyvips": lambda: vips.resize(2, kernel="cubic").write_to_memory()}
    yield "a quarter turn", {
        "picturezor": lambda: picture.rotate(90), "Pillow": lambda: image.transpose(Image.ROTATE_90),
        "OpenCV": lambda: cv2.rotate(array, cv2.ROTATE_90_COUNTERCLOCKWISE),
        "pyvips": lambda: vips.rot270().write_to_memory()}
    yield "left for right", {
        "picturezor": lambda: picture.mirror(horizontal=True), "Pillow": lambda: ImageOps.mirror(image),
        "OpenCV": lambda: cv2.flip(array, 1), "pyvips": lambda: vips.fliphor().write_to_memory()}
    yield "invert", {
        "picturezor": lambda: picture.filter.invert(), "Pillow": lambda: ImageOps.invert(image),
        "OpenCV": lambda: cv2.bitwise_not(array), "pyvips": lambda: vips.invert().write_to_memory()}
    yield "gamma by a table", {
        "picturezor": lambda: picture.filter.gamma(gamma=2.2), "Pillow": lambda: image.point(table.tolist() * 3),
        "OpenCV": lambda: cv2.LUT(array, table)}
    yield "box blur, radius 10", {
        "picturezor": lambda: picture.filter.blur(radius=10), "Pillow": lambda: image.filter(ImageFilter.BoxBlur(10)),
        "OpenCV": lambda: cv2.blur(array, (21, 21))}
    yield "to gray", {
        "picturezor": lambda: picture.convert(format="gray"), "Pillow": lambda: image.convert("L"),
        "OpenCV": lambda: cv2.cvtColor(array, cv2.COLOR_RGB2GRAY),
        "pyvips": lambda: vips.colourspace("b-w").write_to_memory()}
    yield "cut out 2000 x 1500", {
        "picturezor": lambda: picture.crop((500, 500, 2000, 1500)),
        "Pillow": lambda: image.crop((500, 500, 2500, 2000)),
        "OpenCV": lambda: array[500:2000, 500:2500].copy(),
        "pyvips": lambda: vips.crop(500, 500, 2000, 1500).write_to_memory()}
    base, pil_base = picture.copy(), image and image.copy()
    yield "lay over through a mask, in place", {
        "picturezor": lambda: base.combine_with(picture, (0, 0, 4000, 3000), mask=mask),
        "Pillow": lambda: pil_base.paste(image, (0, 0), pil_mask)}
    yield "samples as an array", {
        "picturezor": lambda: np.asarray(picture), "Pillow": lambda: np.asarray(image)}


def calls():
    """Short calls, in microseconds each."""
    picture, dot = pz.Picture(64, 64), (0, 0, 1, 1)
    for name, work in (("width", lambda: picture.width), ("channel_count", lambda: picture.channel_count),
                       ("fill_rect((0, 0, 1, 1), 7)", lambda: picture.fill_rect(dot, 7)),
                       ("row(0)", lambda: picture.row(0)), ("red_channel()", lambda: picture.red_channel()),
                       ("clip_image((0, 0, 1, 1))", lambda: picture.clip_image(dot)),
                       ("clone()", lambda: picture.clone()),
                       ("numpy.asarray(picture)", lambda: np.asarray(picture))):
        def many():
            for _ in range(20000):
                work()

        def none():
            for _ in range(20000):
                (lambda: None)()
        yield name, (best(many) - best(none)) / 20000 * 1e6


def main():
    there = {"picturezor": True, "Pillow": Image, "OpenCV": cv2, "pyvips": pyvips}
    peers = [name for name, found in there.items() if found]
    names = [line.split(":")[1].strip() for line in open("/proc/cpuinfo") if line.startswith("model name")]
    print(f"{names[0] if names else platform.machine()}, {len(os.sched_getaffinity(0))} processors, Python "
          f"{platform.python_version()}. 12 megapixels of RGB, milliseconds, the best of several runs.\n")
    print("|", " | ".join(["", *peers]), "|\n|---|" + "---:|" * len(peers))
    behind = []
    for name, ways in rows():
        times = {peer: best(ways[peer]) * 1e3 for peer in peers if peer in ways}
        cells = [f"{times[peer]:.3g}" if peer in times else "" for peer in peers]
        print("|", " | ".join([name, *cells]), "|", flush=True)
        behind += [name] if times["picturezor"] > min(times.values()) else []
    print(f"\nAhead in each row but: {'; '.join(behind)}." if behind else "\nAhead in each row.")
    module = pathlib.Path(pz.__file__).with_name("PictureZOR.so")
    said = subprocess.run([sys.argv[1], module], check=True, capture_output=True, text=True).stdout
    direct = dict(line.split("\t") for line in said.splitlines())
    print("\nShort calls, microseconds:\n\n| | from Python on | from C++ on |\n|---|---:|---:|")
    for name, cost in calls():
        print(f"| `{name}` | {cost:.2f} | {direct.pop(name, '')} |", flush=True)
    assert not direct, direct


main()
