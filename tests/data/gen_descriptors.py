#!/usr/bin/env python3
"""Writes the golden record files the descriptor tests read.

Every byte is laid out here by hand from the wire format (big-endian), not
by the library, so that the tests compare the library against an
independent picture of the records. Run from anywhere; the files land next
to this script.
"""
import os
import struct

HERE = os.path.dirname(os.path.abspath(__file__))


def be(fmt, *values):
    return struct.pack(">" + fmt, *values)


def code(name):
    assert len(name) == 4
    return be("I", struct.unpack(">I", name.encode("ascii"))[0])


def entry(name, payload, flags=0, major=0, minor=0):
    """type | size (4 + payload) | flags | major | minor | payload"""
    return code(name) + be("I", 4 + len(payload)) + be("HBB", flags, major, minor) + payload


def data(payload):
    return code("DATA") + be("I", len(payload)) + payload


def vers_payload(major, minor, temp, text, letter=None, pad=None, seq=None):
    out = be("HHH", major, minor, temp) + data(text)
    if letter is not None:
        out += be("BB", letter, pad)
    if seq is not None:
        name, epoch, counter = seq
        out += name.ljust(20, b"\0") + be("II", epoch, counter)
    return out


def segment(address, size, minor):
    return entry("MCSD", be("QI", address, size), minor=minor)


def controller6(ddr, segments):
    return entry("MCET", be("HHHHHH", *ddr) + be("H", len(segments)) + b"".join(segments),
                 minor=6)


def controller5(number, segments):
    return entry("MCET", be("II", number, len(segments)) + b"".join(segments), minor=5)


def mcfg(controllers, minor=6):
    return entry("MCFG", be("BB", len(controllers), 0) + b"".join(controllers), minor=minor)


def bseck(executing, errors):
    body = be("HH", executing, len(errors))
    for flags, major, minor, type_, error in errors:
        body += be("HBBHH", flags, major, minor, type_, error)
    return entry("BSCK", body)


def write(name, content):
    with open(os.path.join(HERE, name), "wb") as f:
        f.write(content)


VERS_FULL = entry("VERS", vers_payload(3, 14, 0x0102, b"Release 3.14\0", ord("b"), 0,
                                       (b"MAINLINE", 0x40000002, 7)),
                  flags=0x8001, minor=2)
# Older producers: the entry ends behind the description, or behind pad.
VERS_NO_TAIL = entry("VERS", vers_payload(1, 2, 0, b"old\0"), minor=0)
VERS_TO_PAD = entry("VERS", vers_payload(1, 3, 0, b"older\0", ord("a"), 0x5A), minor=1)

MCFG_MINOR6 = mcfg([
    controller6((32, 2048, 1600, 4, 1, 16),
                [segment(0x0000000040000000, 1024, 6), segment(0x0000000100000000, 1024, 6)]),
    controller6((16, 512, 1333, 3, 2, 8), [segment(0x00000000C0000000, 512, 6)]),
])
# Old layout: controller number and a 32-bit count; sizes in bytes.
MCFG_MINOR5 = mcfg([
    controller5(0, [segment(0x0000000040000000, 0x10000000, 5),
                    segment(0x0000000060000000, 0x00300000, 5)]),
], minor=5)

BSECK = bseck(0x0002, [(0x0001, 1, 2, 0x0010, 0xE001), (0, 0, 0, 0x0011, 0xE002),
                       (0xFFFF, 9, 9, 0x0012, 0xE003)])

AFPD = entry("AFPD", data(b"HELLO\0"))

DEVC = entry("DEVC", be("HBB", 432, 1, 0))
PADD = code("PADD") + be("I", 12) + bytes(range(0xA0, 0xAC))
UNKNOWN = code("XTRA") + be("I", 6) + b"\x01\x02\x03\x04\x05\x06"

FSBL_INFO = entry("FSBL", VERS_FULL + be("I", 5) + DEVC + PADD + MCFG_MINOR6 + UNKNOWN + BSECK)

SEQC = entry("SEQC", b"BUILDSEQ".ljust(20, b"\0") + be("II", 0x40000001, 42))
BCFG = entry("BCFG", data(b"gcc 12; -O2\0"))
BUILD_CONFIG = entry(
    "BLDC",
    b"KRNL" + b"\x00\x05" + b"\x00\x11" + b"c" + b"\0\0\0" + be("I", 0xDEADBEEF) + be("I", 4)
    + SEQC + UNKNOWN + PADD + BCFG)

DATA = data(b"build 2026-11-22 aarch64\0")


def component(tag, device, partition, slot, offset):
    """tag | device, partition, slot (8 bytes each, '.'-padded) | offset (64 bits)"""
    names = b"".join(name.ljust(8, b".") for name in (device, partition, slot))
    return tag + names + be("Q", offset)


COI = (be("H", 0) + component(b"PKGH", b"NOR0", b"BOOT", b"A", 0) + be("I", 2)
       + component(b"KRNL", b"NAND0", b"KERNEL", b"A", 0x800)
       + component(b"ROOT", b"NAND0", b"ROOTFS", b"A", 0x20000))

FILES = {
    "vers_minor2.bin": VERS_FULL,
    "vers_no_tail.bin": VERS_NO_TAIL,
    "vers_to_pad.bin": VERS_TO_PAD,
    "mcfg_minor6.bin": MCFG_MINOR6,
    "mcfg_minor5.bin": MCFG_MINOR5,
    "bseck.bin": BSECK,
    "afpd.bin": AFPD,
    "fsbl_info.bin": FSBL_INFO,
    "build_config.bin": BUILD_CONFIG,
    "data.bin": DATA,
    "coi.bin": COI,
}

if __name__ == "__main__":
    for file_name, content in FILES.items():
        write(file_name, content)
