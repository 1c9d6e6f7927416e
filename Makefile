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
# Every build is a CMake preset (CMakePresets.json; `cmake --list-presets`), in build/<preset>.
JOBS ?= $(shell nproc)
LINUX_DIST = dist/linux-x86_64

WINDOWS_JRE ?=
DIST = $(CURDIR)/dist
WINDOWS_ARCHS = i686 x86_64

.PHONY: all deps demo dist dist-linux dist-windows package test bench fuzz size clean

all: dist

deps:
	bash tools/install-deps.sh

build/%/build.ninja:
	cmake --preset $*

# The application folder of each platform, installed by its install rules (component "application").
# On Linux the rules put it at lib/qz-lumiscope-qz57 under the prefix, as the package has it; the
# folder is moved up from there.
dist-linux: build/linux/build.ninja
	cmake --build --preset linux -j $(JOBS) --target launcher runtime
	rm -rf $(DIST)/.linux $(LINUX_DIST)
	cmake --install build/linux --component application --prefix $(DIST)/.linux
	mv $(DIST)/.linux/lib/qz-lumiscope-qz57 $(LINUX_DIST) && rm -rf $(DIST)/.linux

dist-windows:
	for arch in $(WINDOWS_ARCHS); do \
	  cmake --preset $$arch -DWINDOWS_JRE=$(WINDOWS_JRE) >/dev/null && \
	  cmake --build --preset $$arch -j $(JOBS) --target launcher vmdouble demo_jar && \
	  rm -rf $(DIST)/$$arch && cmake --install build/$$arch --component application --prefix $(DIST)/$$arch || exit 1; \
	done

# Every package into dist/: CPack's preset of each build (DEB on Linux, NSIS for each Windows architecture).
package: dist-linux dist-windows
	cmake --build --preset linux -j $(JOBS) --target package_files
	for preset in linux $(WINDOWS_ARCHS); do \
	  cpack --preset $$preset -D CPACK_OUTPUT_FILE_PREFIX=$(DIST) || exit 1; \
	done

dist: dist-linux dist-windows
	bash tools/size-report.sh build

demo: dist-linux
	bash tools/demo.sh $(LINUX_DIST) demo-out

test: package
	bash tests/run.sh

# Start-up figures (not a test): writes docs/performance.md and docs/performance.png. The packages
# are made first, as their sizes are published beside the figures.
bench: package
	/usr/bin/python3 tools/bench/bench.py --build build

# Ten million runs of each libFuzzer target (CI runs each for 20 s); new inputs go to long-<name>/.
FUZZERS = Picture Utf8 Encode
fuzz: build/fuzz/build.ninja
	cmake --build --preset fuzz -j $(JOBS)
	cd build/fuzz/tests/host && ./units --seeds seeds && for f in $(FUZZERS); do mkdir -p long-$$f && \
	  ./fuzz_$$f -runs=10000000 -seed=1 -max_len=4096 -print_final_stats=1 long-$$f \
	    $$([ $$f = Picture ] && echo seeds) || exit 1; done

size:
	bash tools/size-report.sh build

clean:
	rm -rf build dist demo-out
