# Thin driver over the CMake presets. `make demo` runs the main job,
# `make test` every test suite; both install what they need first.
.PHONY: all deps build demo test check test-unit test-asan clean

all: build

deps:
	@scripts/deps.sh build

build: deps
	cmake --preset default >/dev/null
	cmake --build --preset default

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

# Everything CI runs.
test: test-asan test-unit

clean:
	rm -rf build
