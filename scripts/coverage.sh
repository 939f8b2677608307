#!/bin/sh
# Measures which lines and branches of the plug-in the tests run: builds it with counters in
# build/coverage, runs every test there and prints a line for each file and the lines that no test
# reached.
#
#   scripts/coverage.sh              build, run all tests, report
#   scripts/coverage.sh --report     only report what former runs have counted
set -eu
cd "$(dirname "$0")/.."

scripts/bootstrap.sh
if ! command -v gcovr >/dev/null; then
    echo "coverage: installing gcovr"
    if [ "$(id -u)" -eq 0 ]; then as_root=; else as_root=sudo; fi
    DEBIAN_FRONTEND=noninteractive $as_root \
        apt-get install -y -qq --no-install-recommends gcovr >/dev/null
fi

failed=0
if [ "${1:-}" != --report ]; then
    scripts/build.sh coverage
    find build/coverage -name '*.gcda' -delete
    # What a failed test has counted counts all the same; the failure is told at the end.
    ctest --preset coverage --progress || failed=$?
fi

# Branches to the handling of exceptions that no statement of ours throws are left out.
report() {
    gcovr --root . --filter plugin/ -j 2 --exclude-throw-branches \
        --exclude-unreachable-branches "$@" build/coverage/plugin build/coverage/tests
}

mkdir -p build/coverage/report
report --json build/coverage/report/counts.json
summarise() {
    gcovr --root . --add-tracefile build/coverage/report/counts.json "$@"
}
echo "== lines, and those that no test reached"
summarise --txt
echo "== branches, and where one is not taken"
summarise --txt --branches
summarise --html-details build/coverage/report/index.html --print-summary
echo "the sources with their counts: build/coverage/report/index.html"
exit "$failed"
