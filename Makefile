# Thin wrapper over CMake + Ninja. BUILD_DIR may be overridden, e.g. for a
# sanitizer build: make test BUILD_DIR=build-tsan CMAKE_ARGS=-DMAPCORE_SANITIZE=thread
BUILD_DIR ?= build
CMAKE_ARGS ?=
JOBS ?= $(shell nproc)

.PHONY: deps configure build test demo bench clean

deps:
	@bash scripts/install-deps.sh

configure: deps
	@cmake -S . -B $(BUILD_DIR) -G Ninja $(CMAKE_ARGS) >/dev/null

build: configure
	@cmake --build $(BUILD_DIR) -j $(JOBS)

test: build
	@ctest --test-dir $(BUILD_DIR) --output-on-failure -j $(JOBS)

demo: build
	@$(BUILD_DIR)/examples/demo/mapcore_demo

bench: build
	@for b in $(BUILD_DIR)/bench/bench_*; do echo "== $$b"; $$b || exit 1; done

clean:
	@rm -rf $(BUILD_DIR)
