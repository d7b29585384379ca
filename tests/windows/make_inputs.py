#!/usr/bin/env python3
"""Writes the Wine comparison's inputs as PAM: the bundled sample (8-bit RGB PNG, decoded here with
zlib alone) and a 16-bit RGBA image derived from it whose low bytes are not a copy of the high ones."""
import struct
import sys
import zlib


def read_png_rgb8(path):
    data = open(path, 'rb').read()
    if data[:8] != b'\x89PNG\r\n\x1a\n':
        sys.exit(f'{path}: not a PNG file')
    pos, idat, header = 8, b'', None
    while pos < len(data):
        length, kind = struct.unpack('>I4s', data[pos:pos + 8])
        body = data[pos + 8:pos + 8 + length]
        if kind == b'IHDR':
            header = struct.unpack('>IIBBBBB', body)
        elif kind == b'IDAT':
            idat += body
        pos += 12 + length
    width, height, bits, colour, _, _, interlace = header
    if bits != 8 or colour != 2 or interlace != 0:
        sys.exit(f'{path}: only 8-bit RGB non-interlaced PNG files are handled here')
    raw, stride, bpp = zlib.decompress(idat), width * 3, 3
    rows, prev = [], bytearray(stride)
    for y in range(height):
        f = raw[y * (stride + 1)]
        line = bytearray(raw[y * (stride + 1) + 1:(y + 1) * (stride + 1)])
        for i in range(stride):
            a = line[i - bpp] if i >= bpp else 0
            b = prev[i]
            c = prev[i - bpp] if i >= bpp else 0
            if f == 1:
                line[i] = (line[i] + a) & 255
            elif f == 2:
                line[i] = (line[i] + b) & 255
            elif f == 3:
                line[i] = (line[i] + (a + b) // 2) & 255
            elif f == 4:
                p = a + b - c
                pa, pb, pc = abs(p - a), abs(p - b), abs(p - c)
                line[i] = (line[i] + (a if pa <= pb and pa <= pc else b if pb <= pc else c)) & 255
        rows.append(bytes(line))
        prev = line
    return width, height, rows


def write_pam(path, width, height, depth, maxval, payload):
    kind = 'RGB_ALPHA' if depth == 4 else 'RGB'
    with open(path, 'wb') as out:
        out.write(f'P7\nWIDTH {width}\nHEIGHT {height}\nDEPTH {depth}\nMAXVAL {maxval}\nTUPLTYPE {kind}\nENDHDR\n'.encode())
        out.write(payload)


def main():
    sample, out8, out16 = sys.argv[1:4]
    width, height, rows = read_png_rgb8(sample)
    write_pam(out8, width, height, 3, 255, b''.join(rows))
    # A crop keeps the 16-bit run short; alpha is a ramp, the low bytes a pattern of x and y.
    w16, h16 = min(width, 701), min(height, 433)
    wide = bytearray()
    for y in range(h16):
        row = rows[y]
        for x in range(w16):
            for c in range(3):
                v = row[x * 3 + c] * 256 + ((x * 7 + y * 13 + c * 61) & 255)
                wide += struct.pack('>H', v)
            wide += struct.pack('>H', (x * 65535) // max(1, w16 - 1))
    write_pam(out16, w16, h16, 4, 65535, bytes(wide))


if __name__ == '__main__':
    main()
