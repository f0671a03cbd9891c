# vorcal: convenience targets over CMake.
#   make run             build, then run the vorcal tool and the example engine on bundled samples
#   make test            build, then run every CTest test
#   make check-sanitize  the whole suite under AddressSanitizer and UndefinedBehaviorSanitizer
#   make check-arm       cross-build for 32-bit ARM and run the suite under qemu-arm
#   make fuzz            build the libFuzzer targets with clang and run each FUZZ_SECONDS seconds
#   make bench           build and run the Google Benchmark suites
BUILD ?= build
JOBS ?= $(shell nproc 2>/dev/null || echo 2)
FUZZ_SECONDS ?= 30
CMAKE_FLAGS ?= -DVORCAL_WERROR=ON
GENERATOR := $(shell command -v ninja >/dev/null 2>&1 && echo "-G Ninja")
FUZZ_TARGETS := $(basename $(notdir $(wildcard fuzz/*_fuzzer.cpp)))
SUDO := $(shell [ "$$(id -u)" = 0 ] || echo sudo)

.PHONY: all build run test check-sanitize check-arm fuzz bench install clean

all: build

build:
	cmake -S . -B $(BUILD) $(GENERATOR) $(CMAKE_FLAGS)
	cmake --build $(BUILD) -j $(JOBS)

run: build
	@mkdir -p $(BUILD)/run
	$(BUILD)/bin/vorcal version
	$(BUILD)/bin/vorcal_example_engine $(BUILD)/run/frames.dump
	$(BUILD)/bin/vorcal dump $(BUILD)/run/frames.dump

test: build
	ctest --test-dir $(BUILD) --output-on-failure -j $(JOBS)

check-sanitize:
	cmake -S . -B build-asan $(GENERATOR) $(CMAKE_FLAGS) -DVORCAL_SANITIZE=ON -DVORCAL_BUILD_BENCH=OFF
	cmake --build build-asan -j $(JOBS)
	ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1 \
	  ctest --test-dir build-asan --output-on-failure -j $(JOBS)

check-arm:
	@command -v arm-linux-gnueabihf-g++ >/dev/null 2>&1 && command -v qemu-arm >/dev/null 2>&1 || \
	  { $(SUDO) apt-get update && $(SUDO) apt-get install -y g++-arm-linux-gnueabihf qemu-user googletest; }
	cmake -S . -B build-arm $(GENERATOR) $(CMAKE_FLAGS) -DCMAKE_TOOLCHAIN_FILE=cmake/arm-linux-gnueabihf.cmake \
	  -DVORCAL_GTEST_FROM_SOURCE=ON -DVORCAL_BUILD_BENCH=OFF
	cmake --build build-arm -j $(JOBS)
	ctest --test-dir build-arm --output-on-failure -j $(JOBS)

fuzz:
	CC=clang CXX=clang++ cmake -S . -B build-fuzz $(GENERATOR) $(CMAKE_FLAGS) -DVORCAL_FUZZ=ON \
	  -DVORCAL_SANITIZE=ON -DVORCAL_BUILD_BENCH=OFF -DVORCAL_BUILD_EXAMPLES=OFF
	cmake --build build-fuzz -j $(JOBS) --target $(FUZZ_TARGETS)
	sh fuzz/run_all.sh build-fuzz $(FUZZ_SECONDS) $(JOBS)

bench: build
	@for b in $(BUILD)/bin/*_bench; do [ -x "$$b" ] && "$$b" || exit 1; done

install: build
	cmake --install $(BUILD)

clean:
	rm -rf $(BUILD) build-asan build-arm build-fuzz
