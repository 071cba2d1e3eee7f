# Waiting for what can be seen. To be sourced.
# shellcheck shell=bash

# Seconds after which something hangs: far from what anything here takes, also where the machine is
# emulated and its processors are busy with others.
PATIENCE=120

# wait_until COMMAND...: tries until it succeeds.
wait_until() {
    local end=$((SECONDS + PATIENCE)) pause=0.02
    until "$@"; do
        if [ "$SECONDS" -ge "$end" ]; then
            echo "waited too long for: $*"
            return 1
        fi
        # Quick to see what happens at once; what takes longer needs the machine more than this loop.
        pause "$pause"
        pause=0.1
    done
}

# pause SECONDS: without a process.
pause() {
    [ -n "${NEVER:-}" ] || exec {NEVER}<> <(:)
    read -rt "$1" -u "$NEVER" || true
}

# Milliseconds since the machine was started, in steps of ten: by a clock that nobody sets.
now_ms() {
    local seconds hundredths rest
    # shellcheck disable=SC2034
    IFS='. ' read -r seconds hundredths rest </proc/uptime
    echo $((seconds * 1000 + 10#$hundredths * 10))
}
