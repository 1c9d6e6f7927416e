# One-command entry points. `make deps` installs the toolchain on a fresh Debian 12 machine (root).
#   make demo   build the Linux launcher, its private runtime and the demo application, and run the
#               demo for real (on your display, else on a private Xvfb); screenshots in demo-out/
#   make dist   ready application folders under dist/, laid out by the install rules: linux-x86_64
#               (runs the demo application), i686 and x86_64 (Windows; their runtime slot holds the
#               test stand-in VM unless WINDOWS_JRE=DIR names a Windows Java runtime)
#   make package  the Debian package and both Windows installers, written into dist/
#   make test   build everything and run every test (host unit tests, the scenario table on Linux
#               with the real JVM, and under Wine on each architecture this machine can run)
#   make bench  start-up figures beside the alternatives (docs/performance.md)
#   make fuzz   ten million runs of each fuzz target (picture reader, UTF-8 decoding, argument encoding)
#   make size   print the size report of the release launchers
BUILD ?= build
JOBS ?= $(shell nproc)
CMAKE_FLAGS ?= -G Ninja -DCMAKE_BUILD_TYPE=Release
LINUX_DIST = dist/linux-x86_64

WINDOWS_JRE ?=
DIST = $(CURDIR)/dist
WINDOWS_ARCHS = i686 x86_64

.PHONY: all deps demo dist dist-linux dist-windows package test bench fuzz size clean

all: dist

deps:
	bash tools/install-deps.sh

$(BUILD)/i686/build.ninja:
	cmake -S . -B $(BUILD)/i686 $(CMAKE_FLAGS) -DCMAKE_TOOLCHAIN_FILE=cmake/toolchain-i686-w64-mingw32.cmake
$(BUILD)/x86_64/build.ninja:
	cmake -S . -B $(BUILD)/x86_64 $(CMAKE_FLAGS) -DCMAKE_TOOLCHAIN_FILE=cmake/toolchain-x86_64-w64-mingw32.cmake
$(BUILD)/linux/build.ninja:
	cmake -S . -B $(BUILD)/linux $(CMAKE_FLAGS)

# The application folder of each platform, installed by its install rules (component "application").
# On Linux the rules put it at lib/qz-lumiscope-qz57 under the prefix, as the package has it; the
# folder is moved up from there.
dist-linux: $(BUILD)/linux/build.ninja
	cmake --build $(BUILD)/linux -j $(JOBS) --target launcher runtime
	rm -rf $(DIST)/.linux $(LINUX_DIST)
	cmake --install $(BUILD)/linux --component application --prefix $(DIST)/.linux
	mv $(DIST)/.linux/lib/qz-lumiscope-qz57 $(LINUX_DIST) && rm -rf $(DIST)/.linux

dist-windows: $(BUILD)/i686/build.ninja $(BUILD)/x86_64/build.ninja
	for arch in $(WINDOWS_ARCHS); do \
	  cmake -S . -B $(BUILD)/$$arch -DWINDOWS_JRE=$(WINDOWS_JRE) >/dev/null && cmake --build $(BUILD)/$$arch -j $(JOBS) --target launcher vmdouble demo_jar && \
	  rm -rf $(DIST)/$$arch && cmake --install $(BUILD)/$$arch --component application --prefix $(DIST)/$$arch || exit 1; \
	done

# Every package into dist/: CPack in each build folder (DEB on Linux, NSIS for each Windows architecture).
package: dist-linux dist-windows
	cmake --build $(BUILD)/linux -j $(JOBS) --target package_files
	for build in linux $(WINDOWS_ARCHS); do \
	  (cd $(BUILD)/$$build && cpack -D CPACK_OUTPUT_FILE_PREFIX=$(DIST)) || exit 1; \
	done

dist: dist-linux dist-windows
	bash tools/size-report.sh $(BUILD)

demo: dist-linux
	bash tools/demo.sh $(LINUX_DIST) demo-out

test: package
	bash tests/run.sh $(BUILD)

# Start-up figures (not a test): writes docs/performance.md and docs/performance.png.
bench: dist-linux $(BUILD)/x86_64/build.ninja
	cmake --build $(BUILD)/x86_64 -j $(JOBS) --target launcher vmdouble
	/usr/bin/python3 tools/bench/bench.py --build $(BUILD)

# Ten million runs of each libFuzzer target (CI runs each for 20 s); new inputs go to long-<name>/.
FUZZERS = Picture Utf8 Encode
fuzz: $(BUILD)/linux/build.ninja
	cmake --build $(BUILD)/linux -j $(JOBS) $(addprefix --target build_fuzz_,$(FUZZERS))
	cd $(BUILD)/linux/tests/host && ./units --seeds seeds && for f in $(FUZZERS); do mkdir -p long-$$f && \
	  ./fuzz_$$f -runs=10000000 -seed=1 -max_len=4096 -print_final_stats=1 long-$$f \
	    $$([ $$f = Picture ] && echo seeds) || exit 1; done

size:
	bash tools/size-report.sh $(BUILD)

clean:
	rm -rf $(BUILD) dist demo-out
