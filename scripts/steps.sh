# shellcheck shell=bash
# For scripts of many steps, read with `.`: every step runs even when an earlier one failed, so that one run
# tells everything, and the summary closes the log.

steps_summary=()
steps_failed=0

# step <name> <command...>
step() {
    local name=$1 begun=$SECONDS result=passed
    shift
    printf '\n==== %s\n' "$name"
    "$@" </dev/null || { result=FAILED steps_failed=1; }
    steps_summary+=("$(printf '%-7s %4d s  %s' "$result" $((SECONDS - begun)) "$name")")
}

# Ends the script: 1 if any step failed.
end_of_steps() {
    printf '\n==== summary (%d s)\n' "$SECONDS"
    printf '%s\n' "${steps_summary[@]}"
    exit "$steps_failed"
}
