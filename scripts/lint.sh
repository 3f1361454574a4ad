#!/bin/sh
# Checks the tree: format, clang-tidy, cppcheck, man pages, scripts, documents. Every check runs;
# any complaint makes the whole fail.
#
#   scripts/lint.sh [build-directory]     with compile_commands.json; default build/lint, made here
#
# clang-tidy reads the library, its tools and examples; LINT_TESTS=yes adds the tests, which take
# three times as long. LINT_COMMITS=25 has it read no more than what the last 25 commits changed: a
# file takes some ten seconds. All else reads everything in any case.
set -u
cd "$(dirname "$0")/.." || exit

jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
build=${1:-build/lint}
failed=

check() {
    name=$1
    shift
    echo "lint: $name"
    if ! "$@"; then
        echo "lint: $name FAILED" >&2
        failed="$failed $name"
    fi
}

format() {
    scripts/sources.sh | xargs clang-format-14 --dry-run -Werror
}

# The sources that clang-tidy reads. A header is read through the source of its name.
tidy_sources() {
    if [ "${LINT_TESTS:-no}" = yes ]; then
        left_out='^$'
    else
        left_out='^tests/'
    fi
    all=$(scripts/sources.sh | grep '\.cpp$' | grep -v -e '^fuzz/' -e "$left_out")
    base=HEAD~${LINT_COMMITS:-0}
    if [ -z "${LINT_COMMITS:-}" ] || ! git rev-parse --quiet --verify "$base" >/dev/null; then
        echo "$all"
        return
    fi
    changed=$(git diff --name-only "$base" | sed -n 's/\.[ch]pp$/.cpp/p' | sort -u)
    echo "$all" | grep -Fx "$changed" || true
}

# With assertions on, for the analyzer to read; one file at a time, because it takes a va_list of
# the second file for one that was never initialised.
tidy() {
    if [ ! -f "$build/compile_commands.json" ]; then
        # The analyzer does not accept all of the compiler's flags for protection.
        cmake -S . -B "$build" -G Ninja -DCMAKE_BUILD_TYPE=Debug -DKZ_JAVA=ON -DKZ_BUILD_BENCH=ON \
            -DKZ_HARDEN=OFF -DKZ_PRECOMPILE=OFF >/dev/null || return 1
    fi
    tidy_sources |
        xargs -P "$jobs" -n 1 clang-tidy-14 -p "$build" --quiet --warnings-as-errors='*' 2>&1 |
        { ! grep -v -e 'warnings generated' -e 'warning generated' -e '^Suppressed ' -e '^Use -header-filter'; }
}

# What clang-tidy does not check: whole classes, and what holds on other processors.
other_analyser() {
    cppcheck --quiet --std=c++20 --enable=warning,performance,portability --inconclusive \
        --suppressions-list=scripts/cppcheck_suppressions.txt --error-exitcode=1 -j "$jobs" -I . \
        --template='{file}:{line}: {severity}: {message} [{id}]' kzsdk catalogue tables tools examples
}

man_pages() {
    find tools docs packaging -name '*.[1-8]' -print0 | xargs -0 -r mandoc -T lint -W warning
}

# It takes functions that are called by name for unreachable.
shell_scripts() {
    # shellcheck disable=SC2046 # the names are meant to be split
    shellcheck --external-sources --exclude=SC2317 run .ci/run scripts/*.sh packaging/*.sh fuzz/*.sh evaluation/*.sh \
        packaging/postgresql/kzcat-shards $(grep -l '^#!/bin/sh' packaging/debian/tests/*) \
        tests/bindings/python/*.sh contrib/slurm/*.sbatch
}

python_scripts() {
    for script in bench/*.py bindings/python/*.py bindings/python/kzsdk/*.py evaluation/*.py examples/python/*.py \
        fuzz/*.py packaging/*.py scripts/*.py tests/bindings/python/*.py bench/service/*.py \
        tests/programs/serve_api/*.py; do
        python3 -c 'import ast, sys; ast.parse(open(sys.argv[1]).read(), sys.argv[1])' "$script" || return 1
    done
}

# The package says which types it takes and gives; what the build writes of it has none.
python_types() {
    python3=$(command -v /usr/bin/python3 || echo python3) # the one that mypy is packaged for
    "$python3" -m mypy --config-file bindings/python/pyproject.toml --cache-dir build/mypy \
        bindings/python/kzsdk
}

# ESLint, of the versions in the lock file. Its packages' scripts are not run.
javascript() {
    home=build/lint_javascript
    mkdir -p "$home"
    if ! cmp -s scripts/javascript/package-lock.json "$home/node_modules/fetched.json"; then
        cp scripts/javascript/package.json scripts/javascript/package-lock.json "$home" &&
            (cd "$home" && npm ci --ignore-scripts --no-audit --no-fund --silent) &&
            cp scripts/javascript/package-lock.json "$home/node_modules/fetched.json" || return 1
    fi
    # The rules import what was fetched, which Node looks for above the file that imports it.
    cp scripts/javascript/eslint.config.mjs "$home" || return 1
    git ls-files -z '*.js' '*.mjs' ':!scripts/javascript' |
        xargs -0 -r "$home/node_modules/.bin/eslint" --config "$home/eslint.config.mjs"
}

check clang-format format
check JavaScript javascript
check "shell scripts" shell_scripts
check "Python scripts" python_scripts
check "types in Python" python_types
check "man pages" man_pages
check documents scripts/check_documents.py
check cppcheck other_analyser
check clang-tidy tidy

if [ -n "$failed" ]; then
    echo "lint: failed:$failed" >&2
    exit 1
fi
echo "lint: all clean"
