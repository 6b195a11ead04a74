# Entry points for people and CI. `make demo` and `make check` install what is
# missing (Debian 12, as root), configure, build and run.
BUILD_DIR   ?= build
ASAN_DIR    := $(BUILD_DIR)/asan
RELEASE_DIR := $(BUILD_DIR)/release
FUZZ_DIR    := $(BUILD_DIR)/fuzz
BENCH_DIR   := $(BUILD_DIR)/bench
JOBS        ?= $(shell nproc)
CMAKE_GEN   := -G Ninja

.PHONY: all deps release asan demo check test e2e fuzz bench install clean

all: release

deps:
	@scripts/install-deps

$(RELEASE_DIR)/build.ninja:
	cmake -S . -B $(RELEASE_DIR) $(CMAKE_GEN) -DCMAKE_BUILD_TYPE=Release -DTVX_BUILD_TESTS=OFF

$(ASAN_DIR)/build.ninja:
	cmake -S . -B $(ASAN_DIR) $(CMAKE_GEN) -DCMAKE_BUILD_TYPE=Debug -DTVX_SANITIZE=ON

release: deps $(RELEASE_DIR)/build.ninja
	cmake --build $(RELEASE_DIR) -j $(JOBS)

asan: deps $(ASAN_DIR)/build.ninja
	cmake --build $(ASAN_DIR) -j $(JOBS)

# The main job on the sample media, with the release build.
demo: release
	@scripts/demo $(RELEASE_DIR)

# Everything in the sanitizer build: the demo, then every test.
check: asan
	@scripts/demo $(ASAN_DIR)
	cd $(ASAN_DIR) && ctest --output-on-failure -j $(JOBS) --timeout 600
	@if command -v qemu-system-x86_64 >/dev/null; then scripts/e2e/run $(ASAN_DIR); fi

# The unattended-install media booted in qemu (see scripts/e2e/run).
e2e: asan
	@scripts/e2e/run $(ASAN_DIR)

test: check

fuzz:
	@scripts/install-deps --fuzz
	CC=clang CXX=clang++ cmake -S . -B $(FUZZ_DIR) $(CMAKE_GEN) -DCMAKE_BUILD_TYPE=Debug \
	  -DTVX_BUILD_FUZZ=ON -DTVX_BUILD_TESTS=OFF -DTVX_WERROR=OFF
	cmake --build $(FUZZ_DIR) -j $(JOBS)

bench:
	@scripts/install-deps --bench
	cmake -S . -B $(BENCH_DIR) $(CMAKE_GEN) -DCMAKE_BUILD_TYPE=Release -DTVX_BUILD_BENCH=ON \
	  -DTVX_BUILD_TESTS=OFF
	cmake --build $(BENCH_DIR) -j $(JOBS)
	@scripts/run-bench $(BENCH_DIR)

install: release
	cmake --install $(RELEASE_DIR)

clean:
	rm -rf $(BUILD_DIR)
