# The commands of the README. `make check` is what CI runs.
PRESETS := default asan tsan i386

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

# The demo daemon on the simulated shelf, run twice from the build directory:
# the second run shows the setting the first one saved.
demo: build
	cd build/default && ./KviDemo ../../examples/simulator.conf && ./KviDemo ../../examples/simulator.conf

bench: build
	@for b in build/default/bench/*Bench; do echo "== $$b"; $$b || exit 1; done

fuzz: deps
	cmake --preset fuzz
	cmake --build --preset fuzz
	@for f in build/fuzz/fuzz/*Fuzz; do \
	    n=$$(basename $$f); mkdir -p build/fuzz/work/$$n; echo "== $$n"; \
	    $$f -max_total_time=60 build/fuzz/work/$$n fuzz/corpus/$$n || exit 1; done

clean:
	rm -rf build
