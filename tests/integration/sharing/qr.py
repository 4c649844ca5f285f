"""Reads QR codes that were drawn as SVG: the picture is painted here, and a scanner's library reads it."""

import ctypes
import re

SCALE = 4  # pixels a module
GREY = int.from_bytes(b"Y800", "little")


def painted(svg):
    """The picture of an SVG image whose paths are rectangles of whole modules, black on white, one byte
    a module."""
    size = int(re.search(r'viewBox="0 0 (\d+) \1"', svg).group(1))
    rows = [bytearray(b"\x80" * size) for _ in range(size)]  # neither: what nobody paints
    for fill, path in re.findall(r'<path(?: fill="#(fff)")? d="([^"]*)"/>', svg):
        rectangles = re.findall(r"M(\d+) (\d+)h(\d+)v(\d+)(?:h-\d+|H0)z", path)
        assert path == "".join(re.findall(r"M\d+ \d+h\d+v\d+(?:h-\d+|H0)z", path)), path
        for x, y, width, height in (map(int, rectangle) for rectangle in rectangles):
            for row in rows[y:y + height]:
                row[x:x + width] = (b"\xff" if fill else b"\0") * width
    assert not any(0x80 in row for row in rows)
    return rows


def read_codes(svg):
    """The texts of the QR codes in a picture."""
    rows = painted(svg)
    wide = [bytes(pixel for pixel in row for _ in range(SCALE)) for row in rows]
    pixels = b"".join(row for row in wide for _ in range(SCALE))
    side = len(rows) * SCALE
    zbar = ctypes.CDLL("libzbar.so.0")
    for name in ("zbar_image_scanner_create", "zbar_image_create", "zbar_image_first_symbol",
                 "zbar_symbol_next"):
        getattr(zbar, name).restype = ctypes.c_void_p
    zbar.zbar_symbol_get_data.restype = ctypes.c_char_p
    scanner = ctypes.c_void_p(zbar.zbar_image_scanner_create())
    image = ctypes.c_void_p(zbar.zbar_image_create())
    zbar.zbar_image_set_format(image, ctypes.c_ulong(GREY))
    zbar.zbar_image_set_size(image, side, side)
    zbar.zbar_image_set_data(image, pixels, ctypes.c_ulong(len(pixels)), None)
    assert zbar.zbar_scan_image(scanner, image) >= 0
    texts = []
    symbol = zbar.zbar_image_first_symbol(image)
    while symbol:
        texts.append(zbar.zbar_symbol_get_data(ctypes.c_void_p(symbol)).decode())
        symbol = zbar.zbar_symbol_next(ctypes.c_void_p(symbol))
    zbar.zbar_image_destroy(image)
    zbar.zbar_image_scanner_destroy(scanner)
    return texts
