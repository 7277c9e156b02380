# The two quick-start commands are `make run` and `make test`; each one
# installs what is missing, configures and builds first.
.PHONY: all deps build run test asan test-asan fuzz fuzz-ci coverage-deps coverage bench-deps bench install format clean

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

# gcovr is needed for the coverage report only, so only this target asks for it.
coverage-deps:
	@VRX_EXTRA_DEPS=gcovr:/usr/bin/gcovr bash scripts/install-deps.sh

build-coverage/build.ninja: | coverage-deps
	cmake --preset coverage

# Line and branch coverage of the program's own code (sqo/) over the whole
# suite, the end-to-end runs of the instrumented executable included; fails
# below 95% of lines or 85% of branches. Counts of earlier runs are cleared.
COVERAGE_FLAGS = --root . --filter 'sqo/' --exclude-unreachable-branches --exclude-throw-branches

coverage: coverage-deps build-coverage/build.ninja
	cmake --build --preset coverage
	find build-coverage -name '*.gcda' -delete
	ctest --preset coverage
	gcovr $(COVERAGE_FLAGS) build-coverage
	gcovr $(COVERAGE_FLAGS) --branches --print-summary \
	      --fail-under-line 95 --fail-under-branch 85 build-coverage

# Google Benchmark, GNU time and strace serve the measurements only.
bench-deps:
	@VRX_EXTRA_DEPS="libbenchmark-dev:/usr/include/benchmark/benchmark.h time:/usr/bin/time strace:/usr/bin/strace" \
	  bash scripts/install-deps.sh

build-bench/build.ninja: | bench-deps
	cmake --preset bench

# Benchmarks of the program's own work and of the engine's encoding, then
# whole runs on generated instances of 1,000 to 100,000 applications with
# their floors; prints one table and the targets (docs/performance.md).
bench: bench-deps build-bench/build.ninja
	cmake --build --preset bench
	bash scripts/bench.sh build-bench

install: build
	cmake --install build --prefix $(PREFIX)

format:
	git ls-files '*.cpp' '*.h' | xargs clang-format -i

clean:
	rm -rf build build-asan build-fuzz build-coverage build-bench
