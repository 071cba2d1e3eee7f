#!/usr/bin/env bats
# veskpin pin of a tree of ten thousand files: every one is sent, and they take no memory.

load lib

setup_file() {
    make_volume 1 128M 16M ext4
    mount -t tmpfs -o mode=755 vesk-lib /var/lib # the machine's own is everybody's
}

setup() { fresh_volume; }

# PEAK_KIB: the most memory that it took; its JSON is in ANSWER. It must end with status 0.
peak_of() {
    PEAK_KIB=$(/usr/bin/python3 - "$ANSWER" "$BIN/veskpin" --config "$CONF" --json "$@" <<'END'
import resource, subprocess, sys
with open(sys.argv[1], "wb") as answer:
    subprocess.run(sys.argv[2:], stdout=answer, check=True)
print(resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss)
END
    )
}

@test "ten thousand files take as much memory as ten" {
    local few
    mkdir d
    # Each needs a block on the device, and all together no more than the volume has.
    /usr/bin/python3 -c '
for i in range(10000):
    with open(f"/volume1/d/{i:05}", "wb") as file:
        file.write(b"x" * 4096)'
    sync
    start_service
    set_pending /volume1
    wait_until messages_are_taken
    peak_of pin --no-wait --force /volume1/d/0000?
    few=$PEAK_KIB
    same 10 "$(answer '.files | length')"
    peak_of pin --no-wait --force /volume1/d
    echo "$few KiB, then $PEAK_KIB KiB"
    # A text for each would take more.
    [ "$PEAK_KIB" -lt $((few + 1024)) ]
    same '[10000,["pinning",null]]' "$(answer '[(.files | length), (.files | map([.state,.reason]) | unique[])]')"
    # All are in what the service has stored.
    same 10000 "$(config '[.requests[].data | split(";")[]] | unique | length')"
    same "$(config '.requestQueue | length')" $(($(answer .requestsSent) + 1))
    stop_service
}
