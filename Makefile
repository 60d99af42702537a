# The README's two commands: `make demo` and `make test`. Both install what is missing.
SHELL := /bin/bash
JOBS ?= $(shell nproc)
OUT ?= $(CURDIR)/out
SAMPLE ?= $(CURDIR)/sample

.PHONY: deps build build-release demo test test-asan bench run screenshots clean format

deps:
	@bash scripts/install-deps.sh

build: deps
	@cmake --preset default >/dev/null
	@cmake --build --preset default -j $(JOBS)

build-release: deps
	@cmake --preset release >/dev/null
	@cmake --build --preset release -j $(JOBS)

# Writes the sample company, runs the three outputs on it into ./out and prints their paths.
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

run: build
	@bash scripts/demo.sh build/default "$(SAMPLE)" "" >/dev/null
	@build/default/src/zdrlab --company "$(SAMPLE)/company1"

screenshots: build
	@bash scripts/screenshots.sh build/default docs

clean:
	rm -rf build

format:
	@find src tests tools bench -name '*.cpp' -o -name '*.h' | xargs clang-format -i
