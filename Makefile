# Front door for developers and CI. Every target builds in a folder of its own.
BUILD_TEST ?= build/asan
BUILD_REL ?= build/release
JOBS ?= $(shell nproc)

.PHONY: all build test demo bench format clean

all: build

# The tool and the stand-in loader, optimised; the tests build under `test`.
build:
	cmake -S . -B $(BUILD_REL) -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo -DZR7_TESTS=OFF
	cmake --build $(BUILD_REL) -j $(JOBS)

# The whole suite, built with AddressSanitizer and UndefinedBehaviorSanitizer.
test:
	cmake -S . -B $(BUILD_TEST) -G Ninja -DCMAKE_BUILD_TYPE=Debug -DZR7_SANITIZE=ON
	cmake --build $(BUILD_TEST) -j $(JOBS)
	ASAN_OPTIONS=detect_leaks=1:abort_on_error=0 UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
		ctest --test-dir $(BUILD_TEST) --output-on-failure -j $(JOBS)

# A real installation of the sample under examples/ into a scratch copy in
# $(BUILD_REL)/demo, then what it did.
demo: build
	examples/run-demo.sh $(BUILD_REL)

# The benchmark: the tool against the shell way and a plain copy on three
# sizes of synthetic installation, and the limits (a very deep tree, a very
# large directory). Writes bench/RESULTS.md; the full run takes half an hour
# or more on two cores. BENCH_ARGS passes options to the runner, e.g.
#   make bench BENCH_ARGS="--sizes small --rounds 3 --no-limits"
BENCH_ARGS ?=
bench:
	cmake -S . -B $(BUILD_REL) -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo -DZR7_TESTS=OFF
	cmake --build $(BUILD_REL) -j $(JOBS)
	$(BUILD_REL)/bin/zr7bench_run $(BENCH_ARGS)

format:
	find qsd tests bench -name '*.cpp' -o -name '*.h' | xargs clang-format -i

clean:
	rm -rf build
