# Thin wrapper over CMake + Ninja. BUILD_DIR may be overridden, e.g. for a
# sanitizer build: make test BUILD_DIR=build-tsan CMAKE_ARGS=-DMAPCORE_SANITIZE=thread
# AREAS narrows a test run to some test areas (AREAS="pal http"), TARGETS a build to some targets.
BUILD_DIR ?= build
CMAKE_ARGS ?=
AREAS ?=
TARGETS ?= $(addprefix tests_,$(AREAS))
JOBS ?= $(shell nproc)
empty :=
space := $(empty) $(empty)

# Sanitizer builds (and the fuzz targets) stop at the first report with a failing status and skip
# only the third-party noise listed in scripts/sanitizers/. Plain builds ignore these variables.
SANITIZER_FILES := $(CURDIR)/scripts/sanitizers
export ASAN_OPTIONS ?= detect_leaks=1:halt_on_error=1
export LSAN_OPTIONS ?= suppressions=$(SANITIZER_FILES)/lsan.supp:print_suppressions=0
export UBSAN_OPTIONS ?= halt_on_error=1:print_stacktrace=1
export TSAN_OPTIONS ?= halt_on_error=1:second_deadlock_stack=1:suppressions=$(SANITIZER_FILES)/tsan.supp
# make fuzz: the libFuzzer targets (clang, ASan+UBSan) in their own folder, each run in turn for
# FUZZ_SECONDS. New inputs go to FUZZ_DIR/work/<Name>, findings to FUZZ_DIR/findings/, so the
# checked-in seed corpus only grows by hand. A target parsing markup takes its words from
# fuzz/dict/<Name>.dict.
FUZZ_DIR ?= build-fuzz
FUZZ_SECONDS ?= 60
# make cross-test ARCH=arm64|armhf: cross-build in build-cross-ARCH and run the tests under qemu.
ARCH ?= arm64
# make tsan-test: the areas whose code crosses threads, under ThreadSanitizer in build-tsan.
TSAN_AREAS ?= pal tasking http network statistics e2e chaos

.PHONY: deps configure build test tsan-test demo bench fuzz-build fuzz fuzz-replay cross-test clean

deps:
	@bash scripts/install-deps.sh

configure: deps
	@cmake -S . -B $(BUILD_DIR) -G Ninja $(CMAKE_ARGS) >/dev/null

build: configure
	@cmake --build $(BUILD_DIR) -j $(JOBS) $(if $(TARGETS),--target $(TARGETS))

test: build
	@ctest --test-dir $(BUILD_DIR) --output-on-failure -j $(JOBS) \
	  $(if $(AREAS),-L '^($(subst $(space),|,$(strip $(AREAS))))$$')

tsan-test:
	@$(MAKE) --no-print-directory test BUILD_DIR=build-tsan AREAS="$(TSAN_AREAS)" \
	  CMAKE_ARGS="-DMAPCORE_SANITIZE=thread -DMAPCORE_BENCHMARKS=OFF"

demo: build
	@$(BUILD_DIR)/examples/demo/mapcore_demo

bench: build
	@for b in $(BUILD_DIR)/bench/bench_*; do echo "== $$b"; $$b || exit 1; done

fuzz-build: deps
	@cmake -S . -B $(FUZZ_DIR) -G Ninja -DMAPCORE_FUZZ=ON >/dev/null
	@cmake --build $(FUZZ_DIR) -j $(JOBS)

fuzz: fuzz-build
	@mkdir -p $(FUZZ_DIR)/findings; status=0; \
	for f in $(FUZZ_DIR)/fuzz/fuzz_*; do \
	  name=$${f##*/fuzz_}; echo "== fuzz_$$name for $(FUZZ_SECONDS) s"; \
	  mkdir -p $(FUZZ_DIR)/work/$$name; \
	  dict=; [ -f fuzz/dict/$$name.dict ] && dict=-dict=fuzz/dict/$$name.dict; \
	  $$f -max_total_time=$(FUZZ_SECONDS) -print_final_stats=1 $$dict \
	    -artifact_prefix=$(FUZZ_DIR)/findings/$$name- \
	    $(FUZZ_DIR)/work/$$name fuzz/corpus/$$name || status=1; \
	done; exit $$status

# Each target once over its seed corpus, as CI does.
fuzz-replay: fuzz-build
	@ctest --test-dir $(FUZZ_DIR) --output-on-failure -j $(JOBS)

cross-test:
	@bash scripts/cross-test.sh $(ARCH) $(JOBS)

clean:
	@rm -rf $(BUILD_DIR) $(FUZZ_DIR)
