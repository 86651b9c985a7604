# Front door for developers and CI. Every target builds in a folder of its own.
BUILD_TEST ?= build/asan
BUILD_REL ?= build/release
BUILD_FUZZ ?= build/fuzz
BUILD_MEMCHECK ?= build/memcheck
BUILD_TIDY ?= build/tidy
JOBS ?= $(shell nproc)
FUZZ_SECONDS ?= 60
# Warnings stop the build in the developers' and CI's targets (test, soak,
# fuzz, memcheck) and not in a user's (build, demo, bench); WERROR=ON or
# WERROR=OFF on the command line decides for every target.
WERROR ?=
WERROR_DEV = -DZR7_WERROR=$(or $(WERROR),ON)
WERROR_USER = -DZR7_WERROR=$(or $(WERROR),OFF)
# The sources `make format` rewrites and `make format-check` checks.
FORMAT_FILES = $(sort $(shell find qsd tests fuzz tools bench -name '*.cpp' -o -name '*.h'))
SANITIZER_OPTIONS = ASAN_OPTIONS=detect_leaks=1:abort_on_error=0 \
	UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1

.PHONY: all build test test-ansible soak fuzz memcheck demo bench mutants format format-check tidy clean

all: build

# The tool and the stand-in loader alone, optimised; the tests build under
# `test`, the benchmark under `bench`.
build:
	cmake -S . -B $(BUILD_REL) -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo -DZR7_TESTS=OFF \
		-DZR7_BENCH=OFF $(WERROR_USER)
	cmake --build $(BUILD_REL) -j $(JOBS)

# The whole suite, built with AddressSanitizer and UndefinedBehaviorSanitizer.
# The benchmark's code and its tests are built here too, so that they keep
# compiling while nobody runs the benchmark.
test:
	cmake -S . -B $(BUILD_TEST) -G Ninja -DCMAKE_BUILD_TYPE=Debug -DZR7_SANITIZE=ON \
		-DZR7_BENCH=ON $(WERROR_DEV)
	cmake --build $(BUILD_TEST) -j $(JOBS)
	$(SANITIZER_OPTIONS) ctest --test-dir $(BUILD_TEST) --output-on-failure -j $(JOBS)

# The Ansible module and role of contrib/ansible across five local servers
# (contrib/ansible/tests/run.sh), driving the optimised tool and the stand-in loader:
# the module's unit tests, then the playbooks. Needs ansible-playbook
# (Debian's ansible-core).
test-ansible: build
	ansible_python=$$(sed -n '1s/^#! *\([^ ]*\).*/\1/p' "$$(command -v ansible-playbook)"); \
	"$${ansible_python:-python3}" -m unittest discover -s contrib/ansible/tests -p 'test_*.py'
	PATH="$(CURDIR)/$(BUILD_REL)/bin:$$PATH" contrib/ansible/tests/run.sh

# The robustness tests in their long variants (every kill, the whole wide
# directory), run straight from the test program: they outlast a ctest time
# limit.
soak:
	cmake -S . -B $(BUILD_TEST) -G Ninja -DCMAKE_BUILD_TYPE=Debug -DZR7_SANITIZE=ON \
		-DZR7_BENCH=ON $(WERROR_DEV)
	cmake --build $(BUILD_TEST) -j $(JOBS)
	ZR7_SOAK=1 $(SANITIZER_OPTIONS) $(BUILD_TEST)/bin/test_tool

# The fuzz targets, built with clang apart from the main build, each run for
# FUZZ_SECONDS seconds.
fuzz:
	CC=clang CXX=clang++ cmake -S fuzz -B $(BUILD_FUZZ) -G Ninja -DCMAKE_BUILD_TYPE=Debug \
		$(WERROR_DEV)
	cmake --build $(BUILD_FUZZ) -j $(JOBS)
	FUZZ_SECONDS=$(FUZZ_SECONDS) fuzz/run.sh $(BUILD_FUZZ)

# The end-to-end tests with every run of the tool (the relaunched one
# included) under valgrind's memcheck, in a build without sanitizers. Any
# error or definite leak fails the run of the tool; the reports stay in
# $(BUILD_MEMCHECK)/valgrind.
MEMCHECK = $(shell command -v valgrind) -q --error-exitcode=99 --leak-check=full \
	--errors-for-leak-kinds=definite --trace-children=yes \
	--trace-children-skip=*/cp,*/tr,*/qdsload --log-file=$(CURDIR)/$(BUILD_MEMCHECK)/valgrind/%p.log
memcheck:
	cmake -S . -B $(BUILD_MEMCHECK) -G Ninja -DCMAKE_BUILD_TYPE=Debug -DZR7_SANITIZE=OFF \
		$(WERROR_DEV)
	cmake --build $(BUILD_MEMCHECK) -j $(JOBS) --target test_tool
	rm -rf $(BUILD_MEMCHECK)/valgrind && mkdir -p $(BUILD_MEMCHECK)/valgrind
	ZR7_TOOL_WRAPPER="$(MEMCHECK)" $(BUILD_MEMCHECK)/bin/test_tool
	@reports=$$(find $(BUILD_MEMCHECK)/valgrind -type f -size +0c); \
	if [ -n "$$reports" ]; then cat $$reports; echo "memcheck: errors reported"; exit 1; fi; \
	echo "memcheck: $$(ls $(BUILD_MEMCHECK)/valgrind | wc -l) runs of the tool, no error, no leak"

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
	cmake -S . -B $(BUILD_REL) -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo -DZR7_TESTS=OFF \
		-DZR7_BENCH=ON $(WERROR_USER)
	cmake --build $(BUILD_REL) -j $(JOBS)
	$(BUILD_REL)/bin/zr7bench_run $(BENCH_ARGS)

# The mutation run: each one-line fault of tools/mutants/mutants.txt planted in
# turn, rebuilt in build/mutants (debug, no sanitizers) and the tests run until
# one fails. Lists the faults no test noticed; about a minute a mutant, not in
# CI. MUTANTS="3 7" runs those numbers only.
MUTANTS ?=
mutants:
	python3 tools/mutants/run.py $(MUTANTS)

format:
	clang-format -i $(FORMAT_FILES)

# Fails, naming each file and line, when a source differs from what
# `make format` would make of it.
format-check:
	@clang-format --dry-run -Werror $(FORMAT_FILES)
	@echo "format-check: $(words $(FORMAT_FILES)) files, all formatted"

# clang-tidy with the checks of .clang-tidy over qsd/ and tools/, from the
# compile commands of a build folder of its own (configuring it is enough:
# nothing is compiled). Fails on any finding.
tidy:
	cmake -S . -B $(BUILD_TIDY) -G Ninja -DCMAKE_BUILD_TYPE=Debug -DZR7_TESTS=OFF \
		-DZR7_BENCH=OFF -DZR7_WERROR=OFF
	tools/ci/tidy.sh $(BUILD_TIDY) $(JOBS)

clean:
	rm -rf build
