# One-command entry points. `make deps` installs the toolchain on a fresh Debian 12 machine (root).
#   make dist   build the launcher for i686 and x86_64 into ready application layouts under dist/
#   make test   build everything and run every test (host, then Wine on each available architecture)
#   make size   print the size report of the release launchers
BUILD ?= build
JOBS ?= $(shell nproc)
CMAKE_FLAGS ?= -G Ninja -DCMAKE_BUILD_TYPE=Release

.PHONY: all deps dist test size clean configure-i686 configure-x86_64 configure-host

all: dist

deps:
	bash tools/install-deps.sh

$(BUILD)/i686/build.ninja:
	cmake -S . -B $(BUILD)/i686 $(CMAKE_FLAGS) -DCMAKE_TOOLCHAIN_FILE=cmake/toolchain-i686-w64-mingw32.cmake
$(BUILD)/x86_64/build.ninja:
	cmake -S . -B $(BUILD)/x86_64 $(CMAKE_FLAGS) -DCMAKE_TOOLCHAIN_FILE=cmake/toolchain-x86_64-w64-mingw32.cmake
$(BUILD)/host/build.ninja:
	cmake -S . -B $(BUILD)/host $(CMAKE_FLAGS)

dist: $(BUILD)/i686/build.ninja $(BUILD)/x86_64/build.ninja
	cmake --build $(BUILD)/i686 -j $(JOBS) --target launcher vmdouble
	cmake --build $(BUILD)/x86_64 -j $(JOBS) --target launcher vmdouble
	bash tools/make-dist.sh $(BUILD) dist
	bash tools/size-report.sh $(BUILD)

test: $(BUILD)/i686/build.ninja $(BUILD)/x86_64/build.ninja $(BUILD)/host/build.ninja
	bash tools/run-tests.sh $(BUILD)

size:
	bash tools/size-report.sh $(BUILD)

clean:
	rm -rf $(BUILD) dist
