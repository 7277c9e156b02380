# The two quick-start commands are `make run` and `make test`; each one
# installs what is missing, configures and builds first.
.PHONY: all deps build run test asan test-asan fuzz fuzz-ci install format clean

FUZZ_SECONDS ?= 60
PREFIX ?= /usr/local

all: build

deps:
	@bash scripts/install-deps.sh

build/build.ninja: | deps
	cmake --preset default

build: deps build/build.ninja
	cmake --build --preset default

run: build
	./build/bin/vrxmtrk -i -d -a -p

test: build
	ctest --preset default

build-asan/build.ninja: | deps
	cmake --preset asan

asan: deps build-asan/build.ninja
	cmake --build --preset asan

test-asan: asan
	ctest --preset asan

build-fuzz/build.ninja: | deps
	cmake --preset fuzz

fuzz: deps build-fuzz/build.ninja
	cmake --build --preset fuzz

# Runs every fuzz harness for FUZZ_SECONDS each; fails on any finding.
fuzz-ci: fuzz
	bash scripts/run-fuzzers.sh $(FUZZ_SECONDS)

install: build
	cmake --install build --prefix $(PREFIX)

format:
	git ls-files '*.cpp' '*.h' | xargs clang-format -i

clean:
	rm -rf build build-asan build-fuzz build-coverage
