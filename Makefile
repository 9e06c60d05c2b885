# The commands of daily work; the build itself is CMake's (CMakePresets.json). Everything is made below build/.
#
#   JOBS=n           how many compilers and tests run at a time (all processors)
#   PREFIX=path      where `make install` puts things (/usr/local); DESTDIR is honoured
#   FUZZ_SECONDS=n   how long each fuzzer runs (30); FUZZERS="a b" names some of them
#   BENCH_ARGS=...   arguments for the benchmark program, such as --benchmark_filter=Dn
#   TEST_ARGS=...    arguments for ctest, such as -R DnNormalize

JOBS ?= $(shell nproc)
PREFIX ?= /usr/local
export FUZZ_SECONDS ?= 30
FUZZERS ?=
BENCH_ARGS ?=
TEST_ARGS ?=

SETUP = @cmake/setup-packages.sh
CONFIGURE = @cmake --log-level=NOTICE --preset
BUILD = cmake --build --parallel $(JOBS) --preset
TEST = ctest --parallel $(JOBS) --preset
# ThreadSanitizer needs addresses where it expects them. Not every container lets a program ask for that, nor needs it.
FIXED_ADDRESSES = $(shell setarch $$(uname -m) -R true 2>/dev/null && echo setarch $$(uname -m) -R)
# What is formatted and looked at.
CXX_FILES = find libraries servers tools tests bench fuzz examples -name '*.h' -o -name '*.cpp'

.DEFAULT_GOAL := build
.PHONY: build demo check bench fuzz check-asan check-tsan install format lint clean help

build:  ## build the libraries, the tool and the tests
	$(SETUP) build
	$(CONFIGURE) dev
	$(BUILD) dev

demo:  ## set up what is missing, build, and run the main job on the shipped data
	$(SETUP) build
	$(CONFIGURE) dev
	$(BUILD) dev --target dirbase_tool
	tools/demo.sh build/dev/bin/dirbase

check: build  ## set up what is missing, build, and run every test
	$(TEST) dev $(TEST_ARGS)

check-asan:  ## every test under AddressSanitizer, LeakSanitizer and UndefinedBehaviorSanitizer
	$(SETUP) build
	$(CONFIGURE) asan
	$(BUILD) asan
	$(TEST) asan $(TEST_ARGS)

check-tsan:  ## every test under ThreadSanitizer
	$(SETUP) build
	$(CONFIGURE) tsan
	$(BUILD) tsan
	$(FIXED_ADDRESSES) $(TEST) tsan $(TEST_ARGS)

bench:  ## run the benchmarks: a table here, build/bench.json for programs
	$(SETUP) build bench
	$(CONFIGURE) bench
	$(BUILD) bench --target dirbase_bench
	build/bench/bin/dirbase_bench --benchmark_out=build/bench.json --benchmark_out_format=json $(BENCH_ARGS)

fuzz:  ## run each fuzzer for FUZZ_SECONDS
	$(SETUP) build fuzz
	$(CONFIGURE) fuzz
	$(BUILD) fuzz --target fuzzers
	fuzz/run.sh build/fuzz build/fuzzing $(FUZZERS)

install:  ## install below PREFIX
	$(SETUP) build
	$(CONFIGURE) release -DCMAKE_INSTALL_PREFIX='$(abspath $(PREFIX))'
	$(BUILD) release
	cmake --install build/release

format:  ## bring every source into the house format
	$(SETUP) format
	$(CXX_FILES) | xargs -r clang-format -i

lint:  ## look for habits that turn into faults, and for sources out of format
	$(SETUP) build lint
	$(CONFIGURE) dev
	$(CXX_FILES) | xargs -r clang-format --dry-run -Werror
	run-clang-tidy -quiet -j $(JOBS) -p build/dev '^$(CURDIR)/(libraries|servers|tools)/'

clean:  ## remove everything that was built
	cmake -E rm -rf build

help:  ## this list
	@sed -n 's/^\([a-z-]*\):.*## \(.*\)/  make \1\t\2/p' $(MAKEFILE_LIST) | expand -t 20
	@sed -n 's/^#   \([A-Z]*=.*\)/  \1/p' $(MAKEFILE_LIST)
