# The front door. Every target installs what it needs and builds what it uses.
.DEFAULT_GOAL := help
.PHONY: help demo test clients check commits api-check bench growth soak door tls-check lab lab-full lab-programs lab-record mutants build format-check format asan tsan shipped clang tidy fuzz clean

SETUP := tools/setup/install-packages.sh
JOBS ?= $(shell nproc)
CTEST := ctest --output-on-failure --no-tests=error -LE clients -j $(JOBS)

help:
	@echo "make demo    build, start the agent on an example host; its disks are added, lost, unmounted, claimed"
	@echo "make test    build and run every test but those of make clients"
	@echo "make clients tests with SOAP clients whose tools are large (Java)"
	@echo "make check   commit messages, format, warnings, second compiler, clang-tidy on what changed, sanitizers, fuzzing"
	@echo "make api-check  the OpenAPI description before two judges, and a client's types of it; needs npm"
	@echo "make bench   benchmarks"
	@echo "make growth  instructions per disk of planning, among few disks and among many"
	@echo "make mutants changes the plug-in in 200 places, one at a time: do its tests see it? FILE=PATH, ALL=1"
	@echo "make soak    an agent under mixed clients for SECONDS (180): its memory must stay flat"
	@echo "make door    an agent with 2,000 clients at its doors who want nothing good: others are answered as in peace"
	@echo "make tls-check  testssl on the agent: versions, suites, tickets, known weaknesses"
	@echo "make lab     real disks in a virtual machine: the kernel's, unplugged and plugged; CASE=WORDS, LIST=1"
	@echo "make lab-full  all of it: the contract suite on real disks, twenty power cuts; takes hours"
	@echo "make build   the release build only: build/release"

build:
	@$(SETUP) build
	@cmake --preset release >/dev/null
	@cmake --build --preset release -j $(JOBS)

demo:
	@$(SETUP) build
	@cmake --preset release -DKOVA_BENCHMARKS=OFF >/dev/null
	@cmake --build --preset release -j $(JOBS) --target agentd kovactl
	@tools/demo.sh build/release

test:
	@$(SETUP) build test
	@cmake --preset dev >/dev/null
	@cmake --build --preset dev -j $(JOBS)
	@cd build/dev && $(CTEST)

clients:
	@$(SETUP) build test clients
	@cmake --preset dev >/dev/null
	@cmake --build --preset dev -j $(JOBS) --target agentd kovactl
	@cd build/dev && ctest --output-on-failure --no-tests=error -L clients

check: commits format-check shipped clang tidy asan tsan fuzz

# What the commits since BASE say of themselves (the origin's main branch, if there is one).
commits:
	@python3 -B tools/lint/commit_messages.py $(BASE)

format-check:
	@$(SETUP) check
	@git ls-files '*.h' '*.cpp' | xargs clang-format-14 --dry-run --Werror

format:
	@git ls-files '*.h' '*.cpp' | xargs clang-format-14 -i

# What is shipped, compiled as it is shipped: the optimizer then sees more than in the dev build, and must be content.
shipped:
	@$(SETUP) build
	@cmake --preset shipped >/dev/null
	@cmake --build --preset shipped -j $(JOBS) --target agentd kovactl

# The second compiler: it must understand everything without a warning. Uses the flags of the dev build.
clang:
	@$(SETUP) build test check
	@cmake --preset dev >/dev/null
	@cmake --build --preset dev -j $(JOBS)
	@tools/lint/clang_syntax.py build/dev $(JOBS)

# clang-tidy on what changed since BASE (the origin's main branch, if there is one).
tidy:
	@$(SETUP) build test check
	@cmake --preset dev >/dev/null
	@cmake --build --preset dev -j $(JOBS)
	@tools/lint/tidy_changed.sh build/dev $(BASE)

# The tools come by npm, in the versions of the lock file.
api-check:
	@$(SETUP) build
	@command -v npm >/dev/null || $(SETUP) api
	@cmake --preset dev >/dev/null
	@cmake --build --preset dev --target nox_openapi
	@tools/openapi/check.sh build/dev/share/openapi.json build/api-check

asan:
	@$(SETUP) build test
	@cmake --preset asan >/dev/null
	@cmake --build --preset asan -j $(JOBS)
	@cd build/asan && $(CTEST)

# The thread sanitizer, on the tests in which threads meet.
TSAN_TESTS := tessa_test orbis_test otxctl_test otxctl_fault_test otxctl_contract_test kova_agentd_test kova_module_test agentd_test concurrency_test

tsan:
	@$(SETUP) build test
	@cmake --preset tsan >/dev/null
	@cmake --build --preset tsan -j $(JOBS) --target $(TSAN_TESTS)
	@set -e; for test in $(TSAN_TESTS); do echo "$$test under the thread sanitizer"; \
	  build/tsan/test/$$test --gtest_brief=1; done

# A short run of every fuzz target; a finding is a failure.
fuzz:
	@$(SETUP) build check
	@cmake --preset fuzz >/dev/null
	@cmake --build --preset fuzz -j $(JOBS) --target fuzzers
	@fuzz/run.sh build/fuzz $(or $(SECONDS),20)

bench:
	@$(SETUP) build
	@cmake --preset release -DKOVA_BENCHMARKS=ON >/dev/null
	@cmake --build --preset release -j $(JOBS) --target benchmarks
	@bench/run.sh build/release

# Counted, not timed: the same on every machine, however busy.
growth:
	@$(SETUP) build count
	@cmake --preset release -DKOVA_BENCHMARKS=ON >/dev/null
	@cmake --build --preset release -j $(JOBS) --target planning_bench
	@python3 -B bench/instructions.py build/release/bench/planning_bench

# An agent under load for SECONDS.
soak:
	@$(SETUP) build
	@cmake --preset release >/dev/null
	@cmake --build --preset release -j $(JOBS) --target agentd
	@KOVA_BIN=$(CURDIR)/build/release/bin python3 -B tests/e2e/soak.py $(or $(SECONDS),180)

# An agent whose doors are besieged, for SECONDS each time.
door:
	@$(SETUP) build test
	@cmake --preset release >/dev/null
	@cmake --build --preset release -j $(JOBS) --target agentd
	@KOVA_BIN=$(CURDIR)/build/release/bin python3 -B tests/e2e/door.py $(or $(SECONDS),6)

# What the agent speaks by TLS, looked at by testssl.
tls-check:
	@$(SETUP) build test tls
	@cmake --preset release >/dev/null
	@cmake --build --preset release -j $(JOBS) --target agentd
	@KOVA_BIN=$(CURDIR)/build/release/bin python3 -B tests/e2e/tls_check.py

# A virtual machine with disks, and the programs of the dev build in it; all cases, or those with CASE in their names.
lab: lab-programs
	@python3 -B tests/lab/run.py $(if $(LIST),--list) --case "$(CASE)" build/lab build/dev

# The same with the cases that take long, and with more rounds of those that repeat something.
lab-full: lab-programs
	@python3 -B tests/lab/run.py --full $(if $(LIST),--list) --case "$(CASE)" build/lab build/dev

lab-programs:
	@$(SETUP) build lab
	@cmake --preset dev >/dev/null
	@cmake --build --preset dev -j $(JOBS) --target agentd kovactl linux_contract

# What unit tests read in place of a kernel and of a volume manager, recorded in that machine.
lab-record: lab-programs
	@python3 -B tests/lab/record.py build/lab build/dev otxctl/linux/testing/recorded

# Changes the plug-in one place at a time and tells which changes no test sees: of COUNT (200) places, of the files
# or folders FILE, or of ALL=1.
MUTANT_TESTS := kova_agentd_test example_hosts_test kernel_failures_test model_check_test

mutants:
	@$(SETUP) build test mutants
	@cmake --preset mutants >/dev/null
	@cmake --build --preset mutants -j $(JOBS) --target $(MUTANT_TESTS)
	@python3 -B tools/mutants/mutants.py build/mutants $(MUTANT_TESTS) --jobs $(JOBS) --count $(or $(COUNT),200) \
	  $(if $(ALL),--all) $(if $(FILE),--file $(FILE))

clean:
	rm -rf build
