#!/usr/bin/env python3
"""Power cuts during whole-slot writes, on copies of the example device.

  power_cut.py [BUILD_DIR] [--markdown]

For a NOR slot and two NAND slots (each with a bad block) the power goes after the
k-th write or erase that reaches the chip, for every k from 1 until the write
finishes without a cut (sampled past SAMPLE_ALL cut points). After each cut
it counts the chip's bytes outside the slot that changed (there must be
none), then runs the same command again with the power on and checks that the
slot reads back the written bytes. Prints one table row per slot and exits 1
when a byte outside a slot changed or a rerun did not end right.
"""
import os, random, shutil, subprocess, sys, tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.dirname(HERE)
EXAMPLE = os.path.join(ROOT, 'examples', 'device')
SAMPLE_ALL = 64          # every cut point up to here, then every SAMPLE_STEP-th
SAMPLE_STEP = 8
MAX_CUTS = 4096          # a write of more steps than this is a failure of its own

# slot, its chip's image and the image's geometry: data page and OOB bytes
# (0 for a plain image), and the slot's place in the chip.
SLOTS = [
    ('NOR0.PANEL.A', 'mtd8', 0, 0, 0x30000, 0x10000),
    ('NAND0.KERNEL.A', 'mtd7', 2048, 64, 0x20000, 0x80000),
    ('NAND0.ROOTFS.A', 'mtd7', 2048, 64, 0xA0000, 0x60000),
]


def run(tool, root, *args, data=None):
    return subprocess.run([tool, '--root', root, *args], input=data, capture_output=True)


def file_range(page, oob, start, size):
    """The bytes of chip range [start, start+size) in the image file."""
    if oob == 0:
        return start, start + size
    unit = page + oob
    return start // page * unit, (start + size) // page * unit


def changed_outside(before, after, lo, hi):
    return sum(1 for i, (a, b) in enumerate(zip(before, after)) if a != b and not lo <= i < hi)


def one_slot(tool, work, slot, image, page, oob, start, size):
    rng = random.Random(slot)
    original = open(os.path.join(EXAMPLE, 'dev', image), 'rb').read()
    lo, hi = file_range(page, oob, start, size)
    tried = outside = bad_reruns = 0
    payload = None
    k, finished = 1, False
    while k <= MAX_CUTS:
        root = os.path.join(work, 'device')
        shutil.rmtree(root, ignore_errors=True)
        shutil.copytree(EXAMPLE, root)
        ini = os.path.join(root, 'dev', image + '.ini')
        plain_ini = open(ini).read()
        if payload is None:
            # As much as the slot takes: its size less its bad blocks.
            room = size
            if slot.startswith('NAND'):  # the example's bad blocks are 2 and 5
                room -= 0x20000 * sum(1 for b in (2, 5) if start <= b * 0x20000 < start + size)
            payload = bytes(rng.getrandbits(8) for _ in range(room))
        with open(ini, 'a') as f:
            f.write('powercut = %d\n' % k)
        cut = run(tool, root, 'flash', 'write', slot, '-', '--erase', '--yes', data=payload)
        if cut.returncode == 0:
            finished = True  # the write takes k steps (at most): every cut point before was tried
            break
        tried += 1
        after = open(os.path.join(root, 'dev', image), 'rb').read()
        outside += changed_outside(original, after, lo, hi)
        with open(ini, 'w') as f:
            f.write(plain_ini)
        again = run(tool, root, 'flash', 'write', slot, '-', '--erase', '--yes', data=payload)
        back = run(tool, root, 'flash', 'read', slot, '-n', str(len(payload)), '-o', '-')
        if again.returncode != 0 or back.returncode != 0 or back.stdout != payload:
            bad_reruns += 1
            print('rerun after a cut at step %d of %s failed: %s' %
                  (k, slot, (again.stderr or back.stderr).decode(errors='replace').strip()), file=sys.stderr)
        k += 1 if k < SAMPLE_ALL else SAMPLE_STEP
    return tried, k if finished else 0, outside, bad_reruns


def main():
    args = [a for a in sys.argv[1:] if not a.startswith('--')]
    build = args[0] if args else os.path.join(ROOT, 'build', 'default')
    tool = os.path.join(build, 'tools', 'stbplat')
    rows, failed = [], False
    with tempfile.TemporaryDirectory() as work:
        for slot, image, page, oob, start, size in SLOTS:
            tried, steps, outside, bad = one_slot(tool, work, slot, image, page, oob, start, size)
            rows.append((slot, steps, tried, outside, bad))
            failed = failed or outside != 0 or bad != 0 or tried == 0 or steps == 0
    print('| Slot | Writes and erases of a whole write | Cut points tried | Bytes changed outside the slot | Reruns that did not end right |')
    print('|---|---|---|---|---|')
    for slot, steps, tried, outside, bad in rows:
        print('| %s | %d | %d | %d | %d |' % (slot, steps, tried, outside, bad))
    print('power cut: %d passed, %d failed' % (sum(1 for r in rows if not r[3] and not r[4] and r[2]),
                                              sum(1 for r in rows if r[3] or r[4] or not r[2])))
    return 1 if failed else 0


if __name__ == '__main__':
    sys.exit(main())
