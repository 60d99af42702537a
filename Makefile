# The README's two commands: `make demo` and `make test`. Both install what is missing.
SHELL := /bin/bash
JOBS ?= $(shell nproc)
OUT ?= $(CURDIR)/out
SAMPLE ?= $(CURDIR)/sample

.PHONY: deps build build-release build-strict demo test test-asan bench bench-e2e run screenshots clean format format-check

deps:
	@bash scripts/install-deps.sh

build: deps
	@cmake --preset default >/dev/null
	@cmake --build --preset default -j $(JOBS)

build-release: deps
	@cmake --preset release >/dev/null
	@cmake --build --preset release -j $(JOBS)

# Writes the sample company, runs the three outputs on it into ./out and prints their paths
# and the counts of the dispatch checks.
demo: build-release
	@bash scripts/demo.sh build/release "$(SAMPLE)" "$(OUT)"

test: build
	@ctest --preset default -j $(JOBS)

test-asan: deps
	@cmake --preset asan >/dev/null
	@cmake --build --preset asan -j $(JOBS)
	@ctest --preset asan -j $(JOBS)

bench: build-release
	@bash scripts/bench.sh build/release

# The whole process on the large generated company: wall, processor time and peak memory of
# labels, list and post, against the data load's single-thread floor; checks the outputs.
bench-e2e: build-release
	@bash scripts/bench-e2e.sh build/release

run: build
	@bash scripts/demo.sh build/default "$(SAMPLE)" "" >/dev/null
	@build/default/src/zdrlab --company "$(SAMPLE)/company1"

screenshots: build
	@bash scripts/screenshots.sh build/default docs

clean:
	rm -rf build

FORMATTED = find src tests tools bench \( -name '*.cpp' -o -name '*.h' \) -print0

format:
	@$(FORMATTED) | xargs -0 clang-format -i

# Fails, naming the lines, when a source file is not as clang-format would have it.
format-check: deps
	@$(FORMATTED) | xargs -0 clang-format --dry-run --Werror

# The release build with every warning an error.
build-strict: deps
	@cmake --preset release-strict >/dev/null
	@cmake --build --preset release-strict -j $(JOBS)
