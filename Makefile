# Thin driver over the CMake presets. `make demo` runs the main job,
# `make test` every test suite; both install what they need first.
.PHONY: all deps build tool demo test test-power-cut check test-unit test-asan test-aarch64 test-fuzz test-system test-system-aarch64 bench clean

all: build

deps:
	@scripts/deps.sh build tools

build: deps
	cmake --preset default >/dev/null
	cmake --build --preset default

# The library and the stbplat tool alone, without tests or examples:
# build/default/tools/stbplat.
tool: deps
	cmake --preset default >/dev/null
	cmake --build --preset default --target stbplat stbplat_tool

demo: build
	@scripts/demo.sh build/default

# Quick daily loop: host build and its unit tests only.
check: build
	ctest --preset default

test-unit: build
	ctest --preset default

test-asan: deps
	cmake --preset asan >/dev/null
	cmake --build --preset asan
	ctest --preset asan

# The device build (AArch64 glibc), its unit tests under qemu-aarch64.
test-aarch64:
	@scripts/deps.sh build cross
	cmake --preset aarch64 >/dev/null
	cmake --build --preset aarch64
	ctest --preset aarch64

# Each record reader under libFuzzer (ASan + UBSan) for a bounded time.
FUZZ_SECONDS ?= 20
test-fuzz: deps
	scripts/run-fuzz.sh $(FUZZ_SECONDS)

# Power cuts at every step of whole-slot writes on copies of the example
# device: nothing outside the slot changes, and a rerun ends right.
test-power-cut: build
	python3 bench/power_cut.py build/default

# System tests: the library on a real kernel in a virtual machine (flash
# simulators, an ATA disk, /dev/mem). Ends with its "N passed, N failed" line.
test-system:
	@tests/system/run.sh

# The same on Debian's arm64 kernel (qemu's virt machine) with the device
# build of the library, the guest program and the tool.
test-system-aarch64:
	@STBPLAT_SYSTEM_ARCH=aarch64 tests/system/run.sh

# Everything CI runs; the system tests come last so that their summary lines
# close the output.
test: test-fuzz test-asan test-aarch64 test-unit test-power-cut test-system test-system-aarch64

# Benchmarks (host, -O2): library rates beside their baselines; then the
# size of the stripped device library.
bench:
	@bench/run.sh
	@bench/libsize.sh

clean:
	rm -rf build
