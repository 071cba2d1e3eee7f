# The pin service of a test: started, watched through its files, ended by its process id. What it
# writes is buffered and complete only once it has ended.
# shellcheck shell=bash

SERVICE_LOG=/run/service.log

# run_service [OPTION...]: in the background; leaves its process id in SERVICE_PID. It is ready for
# requests and signals when this returns.
run_service() {
    (
        close_descriptors
        exec "$BIN/veskcachepinfiletool" --start-service --config-path "$CONF" "$@"
    ) &
    SERVICE_PID=$!
    wait_until service_is_ready
}

# The same with --stdout, to SERVICE_LOG.
start_service() { run_service --stdout "$@" >"$SERVICE_LOG" 2>&1; }

# It handles SIGTERM and its queue is there.
service_is_ready() {
    local key value name='' caught=0
    while read -r key value; do
        case "$key" in
        Name:) name=$value ;;
        SigCgt:) caught=$value ;;
        esac
    done <"/proc/$SERVICE_PID/status" || return 1
    # The shell that is about to become the service catches signals too.
    [ "$name" = veskcachepinfil ] && ((0x$caught & 0x4000)) && [ -s "$KEY_FILE" ]
}

# What its threads wait for is told by the arguments of the calls that they are in, whose numbers differ
# from machine to machine.

# The receiver, the first thread, waits for a message: only there is a record's size, 1540 bytes.
receiver_waits() { thread_is_in_call "$SERVICE_PID" ' 0x604 '; }

# What was sent is off the queue and dealt with. In this order: a message is off the queue before it is
# dealt with.
messages_are_taken() { waiting_is 0 && receiver_waits; }

# The worker waits for a request or in a pause, or has ended.
worker_rests() {
    find_worker
    [ -z "$WORKER_THREAD" ] || thread_is_in_call "$WORKER_THREAD" "( 0x189 |$PAUSE_CALL)"
}
find_worker() {
    local task name
    WORKER_THREAD=
    for task in /proc/"$SERVICE_PID"/task/*; do
        # A thread may end meanwhile.
        { read -r name <"$task/comm"; } 2>/dev/null || continue
        [ "$name" != worker ] || WORKER_THREAD=${task##*/}
    done
}

# The call that sleep makes.
PAUSE_CALL='^[0-9]+ 0x0 0x0 0x'

# thread_is_in_call THREAD EXPRESSION
thread_is_in_call() {
    local call
    read -r call <"/proc/$1/syscall" && [[ $call =~ $2 ]]
}

# It has written all that it has to say about what was asked of it. In this order: the receiver has
# woken the worker before it waits.
service_rests() { { receiver_waits || receiver_has_ended; } && worker_rests; }
receiver_has_ended() {
    local pid name state rest
    # shellcheck disable=SC2034
    read -r pid name state rest <"/proc/$SERVICE_PID/stat" && [ "$state" = Z ]
}

# The service is at rest, or comes to it, and must end with status 0.
stop_service() {
    wait_until service_rests
    stop_service_by TERM
}

# stop_service_by SIGNAL
stop_service_by() {
    local status=0
    is_child "$SERVICE_PID" || {
        echo "the service has ended before"
        return 1
    }
    kill -s "$1" "$SERVICE_PID"
    wait_until service_has_ended
    wait "$SERVICE_PID" || status=$?
    SERVICE_PID=
    [ "$status" -eq 0 ] || {
        echo "the service ended with status $status"
        return 1
    }
}

# Every thread of it: its first one may have ended long before. The shell may have noticed already.
service_has_ended() {
    local threads=(/proc/"$SERVICE_PID"/task/*)
    [ "${#threads[@]}" -eq 1 ] || return 1
    [ ! -e "/proc/$SERVICE_PID" ] || receiver_has_ended
}

# is_child PID: a process that this shell has started and not yet waited for. Only such a one gets a
# signal: any other number may be somebody else's by now.
is_child() {
    local pid name state parent rest
    # shellcheck disable=SC2034
    [ -n "${1:-}" ] && read -r pid name state parent rest 2>/dev/null <"/proc/$1/stat" &&
        [ "$parent" = "$BASHPID" ]
}

# Ends what a failed test left running, and shows what the service wrote.
end_service() {
    release_device
    if is_child "${SERVICE_PID:-}"; then
        kill -s TERM "$SERVICE_PID"
        PATIENCE=10 wait_until service_has_ended || true
    fi
    SERVICE_PID=
    end_children
    # Shown by bats where the test has failed.
    [ ! -e "$SERVICE_LOG" ] || tail -n 40 "$SERVICE_LOG"
    rm -f "$SERVICE_LOG"
}
end_children() {
    local pid
    for pid in $(jobs -p); do
        ! is_child "$pid" || kill -s KILL "$pid"
        wait "$pid" 2>/dev/null || true
    done
}

# The service is to be stopped, having written exactly the lines of standard input, ":" as in
# answers; without the line of its start.
service_said() {
    stop_service
    sed 's/^:/veskcachepinfiletool:/' >"$BATS_TEST_TMPDIR/expected"
    sed '1{/: Service starts (Build time: 2018-06-08-15:24)$/d}' "$SERVICE_LOG" |
        diff -u "$BATS_TEST_TMPDIR/expected" -
}

# What is asked again and again is read from the document's text, without a process.

# Sets NEXT_NUMBER, the number that the next request will get, QUEUE, the queue as it is written, and
# HAS_DOCUMENT, all of one moment.
look_at_requests() {
    local text='' rest
    NEXT_NUMBER=0 QUEUE='' HAS_DOCUMENT=
    [ ! -e "$CONF" ] || IFS= read -rd '' text <"$CONF" || true
    [ -z "$text" ] || HAS_DOCUMENT=yes
    [[ ! $text =~ \"nextRequestNum\"[[:space:]]*:[[:space:]]*([0-9]+) ]] ||
        NEXT_NUMBER=${BASH_REMATCH[1]}
    [[ $text =~ \"requestQueue\"[[:space:]]*:[[:space:]]*\[ ]] || return 0
    rest=${text#*"${BASH_REMATCH[0]}"}
    QUEUE=${rest%%]*}
}

# Request NUMBER is in the configuration file / is not in it any more / was never.
request_is_stored() {
    look_at_requests
    [ "$NEXT_NUMBER" -gt "$1" ]
}
request_is_done() {
    look_at_requests
    [ "$NEXT_NUMBER" -gt "$1" ] && [[ $QUEUE != *"\"$1\""* ]]
}
config_has() { jq -e "$1" "$CONF" >/dev/null 2>&1; }
queue_is_empty() {
    look_at_requests
    [ -n "$HAS_DOCUMENT" ] && [[ $QUEUE != *[0-9]* ]]
}

# join FILE...: the form of the files argument.
join() {
    local IFS=';'
    echo "$*"
}

# pin N FILE... / unpin N FILE... / reload N: one request on volume N, waits until it is done.
pin() { request_and_wait --pin-files "$(join "${@:2}")" --mount-path "/volume$1"; }
unpin() { request_and_wait --unpin-files "$(join "${@:2}")" --mount-path "/volume$1"; }
reload() { request_and_wait --reload-blocks --mount-path "/volume$1"; }
request_and_wait() {
    local number
    look_at_requests
    number=$NEXT_NUMBER
    tool "$@"
    wait_until request_is_done "$number"
}
