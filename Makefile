# Front door of the build. `make` builds the release configuration, `make test`
# builds it and runs the whole suite. Both install missing Debian packages first.
JOBS ?= $(shell nproc)
FUZZ_SECONDS ?= 60
BUILD := build/release
ASAN_BUILD := build/asan
FUZZ_BUILD := build/fuzz

.PHONY: all deps test test-asan fuzz bench demo clean

all: deps
	cmake -S . -B $(BUILD) -DCMAKE_BUILD_TYPE=Release >/dev/null
	cmake --build $(BUILD) -j $(JOBS)

deps:
	@scripts/install-deps

test: all
	ctest --test-dir $(BUILD) --output-on-failure -j $(JOBS)

# Builds the engine and runs the examples of examples/shoal (waves over a
# shoal in a flume, with a map of the significant wave height),
# examples/beach (waves from a line breaking on a beach, in two runs, the
# second hot-started from the first), examples/harbour (the disturbance
# map and report of a harbour behind a breakwater) and examples/profile
# (a 1DH flume: waves breaking and running up a beach, with surface
# profiles, gauges, wave heights, set-up and runup), with pictures of what
# they wrote.
demo: all
	examples/shoal/run.sh $(CURDIR)/$(BUILD)
	examples/beach/run.sh $(CURDIR)/$(BUILD)
	examples/harbour/run.sh $(CURDIR)/$(BUILD)
	examples/profile/run.sh $(CURDIR)/$(BUILD)

# The speed of the 2DH time loop: a table of points per second by grid size,
# sweep family and thread count, beside the bandwidth of a plain copy.
bench: all
	$(BUILD)/tools/bwbench/bwbench

# The whole suite under AddressSanitizer and UndefinedBehaviorSanitizer.
test-asan: deps
	cmake -S . -B $(ASAN_BUILD) -DCMAKE_BUILD_TYPE=Debug -DBW_SANITIZE=ON >/dev/null
	cmake --build $(ASAN_BUILD) -j $(JOBS)
	ASAN_OPTIONS=detect_leaks=1:abort_on_error=0 \
	LSAN_OPTIONS=suppressions=$(CURDIR)/tests/asan.supp:print_suppressions=0 \
	UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
	ctest --test-dir $(ASAN_BUILD) --output-on-failure -j $(JOBS)

# The parameter parser, then the data-file readers, under libFuzzer for
# FUZZ_SECONDS seconds each; the bad-input corpus of the suite seeds the first.
fuzz:
	@scripts/install-deps fuzz
	CC=clang CXX=clang++ cmake -S . -B $(FUZZ_BUILD) -DCMAKE_BUILD_TYPE=Debug -DBW_FUZZ=ON -DBW_TESTS=OFF >/dev/null
	cmake --build $(FUZZ_BUILD) -j $(JOBS) --target kvt_fuzz xol_fuzz
	mkdir -p $(FUZZ_BUILD)/corpus $(FUZZ_BUILD)/xol_corpus
	$(FUZZ_BUILD)/tests/fuzz/kvt_fuzz -max_total_time=$(FUZZ_SECONDS) -max_len=4096 \
	    $(FUZZ_BUILD)/corpus tests/fuzz/corpus tests/system/bad_input
	LSAN_OPTIONS=suppressions=$(CURDIR)/tests/asan.supp:print_suppressions=0 \
	$(FUZZ_BUILD)/tests/fuzz/xol_fuzz -max_total_time=$(FUZZ_SECONDS) -max_len=4096 \
	    $(FUZZ_BUILD)/xol_corpus tests/fuzz/xol_corpus

clean:
	rm -rf build
