# Front door of the build. Every target drives CMake in a build folder of its
# own, so the plain, sanitizer and 32-bit builds never mix.
#
# Each target first makes sure the Debian packages it needs are there
# (tools/ensure-packages installs the missing ones, or says how).
#
#   make              build (build/)
#   make demo         build the host program, the plug-in and libpmem only, and
#                     run the host on the example dump
#   make screenshot   the example's inventory as one HTML page (build/inventory.html)
#                     and a picture of it in headless Chromium (build/inventory.png)
#   make test         build and run every test for this machine's architecture
#   make check        the tests again under ASan+UBSan (clang), as a 32-bit x86 build, and
#                     the plug-in's thread tests under ThreadSanitizer (clang)
#   make install PREFIX=/opt/corvane   programs to PREFIX/bin, libraries to PREFIX/lib
#   make fuzz         build the libFuzzer targets (clang) and run each for FUZZ_SECONDS
#   make bench        build and run the benchmarks
#   make format       clang-format every C++ source
#   make clean

PREFIX ?= /usr/local
JOBS ?= $(shell nproc 2>/dev/null || echo 2)
FUZZ_SECONDS ?= 60
CMAKE ?= cmake
CTEST ?= ctest
GENERATOR := $(shell command -v ninja >/dev/null 2>&1 && echo "-G Ninja")

BUILD := build
ASAN_BUILD := build-asan
M32_BUILD := build-m32
TSAN_BUILD := build-tsan
FUZZ_BUILD := build-fuzz
EXAMPLE := examples/demo-server.smbios.txt

.PHONY: all build demo screenshot test check check-asan check-m32 check-tsan install fuzz bench format clean

all: build

# packages-GOAL: the Debian packages of that goal (see tools/ensure-packages).
packages-%:
	@sh tools/ensure-packages $*

$(BUILD)/CMakeCache.txt: | packages-build
	$(CMAKE) -S . -B $(BUILD) $(GENERATOR) -DCMAKE_BUILD_TYPE=RelWithDebInfo

build: packages-build $(BUILD)/CMakeCache.txt
	$(CMAKE) --build $(BUILD) -j $(JOBS)

# What the demo runs, and nothing else: no test or benchmark is compiled.
DEMO_TARGETS := smbios-inventory smbiosmi pmem
DEMO_OPTIONS := --sensors processor --sensors disk --bmc

demo: packages-build $(BUILD)/CMakeCache.txt
	$(CMAKE) --build $(BUILD) -j $(JOBS) --target $(DEMO_TARGETS)
	$(BUILD)/out/smbios-inventory --dump $(EXAMPLE) $(DEMO_OPTIONS)

# The demo's page as a browser shows it: headless Chromium with a fresh
# profile that is removed afterwards, no network, killed after two minutes.
# Chromium's own chatter goes to build/screenshot.log, shown when it fails.
CHROMIUM_FLAGS := --headless --no-sandbox --disable-gpu --disable-quic --no-first-run \
  --disable-background-networking --disable-component-update --disable-sync

screenshot: packages-build packages-browser $(BUILD)/CMakeCache.txt
	$(CMAKE) --build $(BUILD) -j $(JOBS) --target $(DEMO_TARGETS)
	$(BUILD)/out/smbios-inventory --dump $(EXAMPLE) $(DEMO_OPTIONS) --format html \
	  >$(BUILD)/inventory.html
	@rm -f $(BUILD)/inventory.png; \
	profile=$$(mktemp -d) || exit 1; \
	timeout -k 5 120 chromium $(CHROMIUM_FLAGS) --user-data-dir="$$profile" \
	  --window-size=1280,2000 --screenshot="$(CURDIR)/$(BUILD)/inventory.png" \
	  "file://$(CURDIR)/$(BUILD)/inventory.html" >$(BUILD)/screenshot.log 2>&1; \
	status=$$?; rm -rf "$$profile"; \
	if [ $$status -ne 0 ] || [ ! -s $(BUILD)/inventory.png ]; then \
	  cat $(BUILD)/screenshot.log >&2; echo "chromium failed (status $$status)" >&2; exit 1; \
	fi; \
	echo "wrote $(BUILD)/inventory.html and $(BUILD)/inventory.png"

test: build
	$(CTEST) --test-dir $(BUILD) --output-on-failure -j $(JOBS)

check: check-asan check-m32 check-tsan

check-asan: packages-check
	CC=clang CXX=clang++ $(CMAKE) -S . -B $(ASAN_BUILD) $(GENERATOR) -DCMAKE_BUILD_TYPE=Debug -DSMBIOS_SANITIZE=ON
	$(CMAKE) --build $(ASAN_BUILD) -j $(JOBS)
	ASAN_OPTIONS=detect_leaks=1 UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
	  $(CTEST) --test-dir $(ASAN_BUILD) --output-on-failure -j $(JOBS)

# On a kernel that cannot run 32-bit programs, tools/m32-runner names
# qemu-i386 and the tests run the built programs under it.
check-m32: packages-check
	runner=$$(sh tools/m32-runner $(M32_BUILD)) && \
	$(CMAKE) -S . -B $(M32_BUILD) $(GENERATOR) -DCMAKE_BUILD_TYPE=RelWithDebInfo \
	  -DCMAKE_C_FLAGS=-m32 -DCMAKE_CXX_FLAGS=-m32 -DSMBIOS_BENCH=OFF \
	  -DSMBIOS_TEST_EMULATOR="$$runner"
	$(CMAKE) --build $(M32_BUILD) -j $(JOBS)
	$(CTEST) --test-dir $(M32_BUILD) --output-on-failure -j $(JOBS)

# ThreadSanitizer: the platform library, the plug-in and its thread tests only.
check-tsan: packages-check
	CC=clang CXX=clang++ $(CMAKE) -S . -B $(TSAN_BUILD) $(GENERATOR) -DCMAKE_BUILD_TYPE=RelWithDebInfo \
	  -DSMBIOS_TSAN=ON -DSMBIOS_BENCH=OFF
	$(CMAKE) --build $(TSAN_BUILD) -j $(JOBS) --target plugin_thread_tests
	TSAN_OPTIONS=halt_on_error=1:second_deadlock_stack=1 \
	  $(CTEST) --test-dir $(TSAN_BUILD) --output-on-failure -j $(JOBS) -R "^PluginThreads\."

install: build
	$(CMAKE) --install $(BUILD) --prefix $(PREFIX)

fuzz: packages-fuzz
	CC=clang CXX=clang++ $(CMAKE) -S . -B $(FUZZ_BUILD) $(GENERATOR) -DCMAKE_BUILD_TYPE=RelWithDebInfo \
	  -DSMBIOS_FUZZ=ON -DSMBIOS_TESTS=OFF -DSMBIOS_BENCH=OFF
	$(CMAKE) --build $(FUZZ_BUILD) -j $(JOBS)
	FUZZ_SECONDS=$(FUZZ_SECONDS) fuzz/run-all $(FUZZ_BUILD)/out

bench: packages-bench build
	$(BUILD)/out/smbios-bench

format: packages-format
	find format platform smbios mi pmem tools tests bench fuzz examples \
	  \( -name '*.cpp' -o -name '*.h' \) -print0 | xargs -0 clang-format -i

clean:
	rm -rf $(BUILD) $(ASAN_BUILD) $(M32_BUILD) $(TSAN_BUILD) $(FUZZ_BUILD)
