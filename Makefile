# The commands of the README. `make check` is what CI runs.
PRESETS := default asan tsan i386
# The fuzz recipe reads a fuzz target's status through a pipe.
SHELL := /bin/bash

.PHONY: all deps check build bench demo fuzz clean $(addprefix check-,$(PRESETS))

all: build

deps:
	@bash scripts/install-deps

build: deps
	cmake --preset default
	cmake --build --preset default

check: deps $(addprefix check-,$(PRESETS))

# A static pattern rule: make skips implicit rules for phony targets.
$(addprefix check-,$(PRESETS)): check-%: deps
	cmake --preset $*
	cmake --build --preset $*
	ctest --preset $*

# The shell's tour of the simulated shelf, from the build directory, on a
# fresh store; then the shell again, a new library, shows what the tour set last.
DEMO_SHELL := ./tools/shell/kvi-hpi-shell --config ../../examples/simulator.conf
demo: build
	rm -rf /tmp/kvi-simulator-nv
	cd build/default && $(DEMO_SHELL) ../../examples/tour.hsh
	@echo "== a second shell: a new process, the library started anew; the tag and the threshold set last are back"
	cd build/default && $(DEMO_SHELL) -e resources \
	    -e "sensor thresholds {SYSTEM_CHASSIS,1}{PROCESSOR_BOARD,1} 1"

bench: build
	@for b in build/default/bench/*Bench; do echo "== $$b"; $$b || exit 1; done

# Seconds each fuzz target runs: make fuzz FUZZ_SECONDS=600. A target's own
# libFuzzer flags, if any, are in fuzz/<Target>.options.
FUZZ_SECONDS ?= 60

fuzz: deps
	cmake --preset fuzz
	cmake --build --preset fuzz
	@for f in build/fuzz/fuzz/*Fuzz; do \
	    n=$$(basename $$f); mkdir -p build/fuzz/work/$$n; echo "== $$n"; \
	    $$f $$(cat fuzz/$$n.options 2>/dev/null) -max_total_time=$(FUZZ_SECONDS) \
	        -print_final_stats=1 build/fuzz/work/$$n \
	        fuzz/corpus/$$n 2>&1 | tee build/fuzz/work/$$n.log; \
	    test $${PIPESTATUS[0]} -eq 0 || exit 1; done; \
	echo "== inputs run in $(FUZZ_SECONDS) s each"; \
	for f in build/fuzz/fuzz/*Fuzz; do n=$$(basename $$f); \
	    runs=$$(sed -n 's/^stat::number_of_executed_units: *//p' build/fuzz/work/$$n.log); \
	    printf '%-24s %10d inputs %8d/s\n' $$n $$runs $$((runs / $(FUZZ_SECONDS))); done

clean:
	rm -rf build
