# vorcal: convenience targets over CMake.
#   make run             install a compiler and CMake when missing, build the library,
#                        libvorsal, the vorcal tool and the example engine, and run the tool on
#                        the bundled samples
#   make test            install GoogleTest (and python3) too when missing, build everything, run
#                        every CTest test
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

VORCAL := $(BUILD)/bin/vorcal
SAMPLES := tests/data/samples
HEAAC := tests/data/heaac
RUN := $(BUILD)/run

all: build

build:
	cmake -S . -B $(BUILD) $(GENERATOR) $(CMAKE_FLAGS)
	cmake --build $(BUILD) -j $(JOBS)

run:
	@sh .ci/install-deps build
	cmake -S . -B $(BUILD) $(GENERATOR) $(CMAKE_FLAGS)
	cmake --build $(BUILD) -j $(JOBS) --target vorcal vorsal vorcal_cli vorcal_example_engine
	@rm -rf $(RUN) && mkdir -p $(RUN)
	$(VORCAL) --version
	$(VORCAL) probe $(SAMPLES)/h264_high.mp4 $(SAMPLES)/aac_lc.m4a $(HEAAC)/bear_v1_aot5.mp4 \
	  $(SAMPLES)/amr_nb.amr $(SAMPLES)/mpeg4_asp.m4v
	$(VORCAL) aac $(HEAAC)/bear_v1_implicit.aac
	$(VORCAL) sps $(SAMPLES)/h264_high.mp4
	$(VORCAL) frames $(SAMPLES)/h264_high.mp4
	$(VORCAL) frames $(SAMPLES)/h264_misread.mp4
	$(VORCAL) convert $(SAMPLES)/h264_high.mp4 $(RUN)/h264_high.h264 --to annexb
	$(VORCAL) frames $(RUN)/h264_high.h264
	$(VORCAL) probe tests/data/hevc/decode_128x96.mp4 && $(VORCAL) frames tests/data/hevc/main_176x144.hevc
	$(VORCAL) silence --codec aac -o $(RUN)/silence.aac
	$(VORCAL) silence --codec amrnb -o $(RUN)/silence.amr
	$(VORCAL) probe $(RUN)/silence.aac $(RUN)/silence.amr
	$(VORCAL) replay $(SAMPLES)/amr_nb.amr --lock-amr --params
	$(BUILD)/bin/vorcal_example_engine $(RUN)/frames.dump
	$(VORCAL) dump $(RUN)/frames.dump
	$(VORCAL) replay $(RUN)/frames.dump --wants annexb --strip-ps

test:
	@sh .ci/install-deps test
	cmake -S . -B $(BUILD) $(GENERATOR) $(CMAKE_FLAGS)
	cmake --build $(BUILD) -j $(JOBS)
	ctest --test-dir $(BUILD) --output-on-failure -j $(JOBS)

check-sanitize:
	cmake -S . -B build-asan $(GENERATOR) $(CMAKE_FLAGS) -DVORCAL_SANITIZE=ON -DVORCAL_BUILD_BENCH=OFF
	cmake --build build-asan -j $(JOBS)
	ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1 \
	  ctest --test-dir build-asan --output-on-failure -j $(JOBS)

check-arm:
	@command -v arm-linux-gnueabihf-g++ >/dev/null 2>&1 && command -v qemu-arm >/dev/null 2>&1 || \
	  { $(SUDO) apt-get update && \
	    $(SUDO) apt-get install -y g++-arm-linux-gnueabihf qemu-user googletest; }
	cmake -S . -B build-arm $(GENERATOR) $(CMAKE_FLAGS) \
	  -DCMAKE_TOOLCHAIN_FILE=cmake/arm-linux-gnueabihf.cmake \
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
