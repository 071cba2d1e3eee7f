#!/usr/bin/env bats
# What an ordinary user does to his files while root pins and unpins them with veskpin.
# What stands in single quotes is for other programs.
# shellcheck disable=SC2016

load lib

setup_file() {
    make_volume 1 64M 16M ext4
    mount -t tmpfs -o mode=755 vesk-lib /var/lib # the machine's own is everybody's
}

setup() {
    fresh_volume
    attacker_folder /volume1/photos
    mkdir -m 700 /volume1/victim
    random /volume1/victim/secret 64K conv=fsync
}

teardown() {
    touch /tmp/rest
    end_service
}

# secret_is STATE: and all of its blocks are marked, or it is not recorded.
secret_is() {
    veskpin --json list /volume1/victim >"$ANSWER" || true
    same "[\"$1\"]" "$(answer '[.files[].state]')"
}

# Whatever has become of it.
is_told() { same true "$(answer '[.files[], .skipped[] | .path] | any(. == $path)' --arg path "$1")"; }

@test "nothing is told as done while it is under way, whichever file a request came to name" {
    local i verb
    rm -f /tmp/rest
    for i in a b rests1 rests2 rests3; do
        his dd if=/dev/urandom of="$i" bs=100K count=1 conv=fsync status=none
    done
    sync
    start_service
    # Two files that change places all the time: neither is ever gone, but the service may see the other one.
    (close_descriptors && his python3 -c 'import ctypes, os
c = ctypes.CDLL(None)
while not os.path.exists("/tmp/rest"):
    for i in range(50):
        c.renameat2(-100, b"a", -100, b"b", 2)') &
    for i in 1 2 3 4 5 6 7 8; do
        for verb in pin unpin; do
            veskpin --json "$verb" /volume1/photos >"$ANSWER" || [ $? -ne 2 ]
            answer '[.files[] | [.path, .state, .reason]]'
            [ "$verb" = unpin ] || { is_told /volume1/photos/a && is_told /volume1/photos/b; }
            same '[]' "$(answer '[.files[] | select((.state | IN("pinning", "unpinning")) and .reason == null)]')"
        done
    done
    touch /tmp/rest
    wait_until service_rests
    veskpin --json unpin /volume1/photos/rests1 /volume1/photos/rests2 /volume1/photos/rests3 >"$ANSWER"
    stop_service
}

# What he does with his folder, until /tmp/rest is there.
restless() {
    his perl -e '
        sub fill {
            open(my $file, ">", "new") || return;
            print $file "x" x (1 + rand(150000));
            close($file);
            rename("new", $_[0]);
        }
        for (my $n = 0; !-e "/tmp/rest"; ++$n) {
            fill("f" . int(rand(8)));
            rename("f" . int(rand(8)), "f" . int(rand(8)));
            unlink("f" . int(rand(8))) if $n % 3 == 0;
            mkdir("d");
            fill("d/secret");
            rename("d", "gone") && symlink("../victim", "d");
            select(undef, undef, undef, rand(0.05));
            unlink("d", "gone/secret");
            rmdir("gone");
        }'
}

# The answer tells of each file that rests, and was to be changed, what is so; and of nothing outside the tree. A
# request is dropped whole where one of its files is changed in its last moment: that is told, and all the harm.
rests_are_told() { # VERB
    same '[]' "$(answer '[.files[], .skipped[] | .path | select(startswith("/volume1/photos/") | not)]')"
    answer '.files[] | select(.path | test("/rests[1-6]$")) | [.path, .state, .reason]' >/run/told
    if [ "$1" = pin ]; then
        same 6 "$(wc -l </run/told)"
        refute grep -vE '"(pinned",null|unpinned","dropped")]' /run/told
    else
        same "$RECORDED" "$(wc -l </run/told)"
        refute grep -vE '"(unpinned",null|pinned","dropped")]' /run/told
    fi
    veskpin list --json /volume1/photos >"$ANSWER" || true
    is_subset "$(jq -c '.[:2]' /run/told)" "$(answer '.files[] | [.path, .state]')"
}

@test "a tree that he changes meanwhile does no harm to other users" {
    local i verb status restless
    rm -f /tmp/rest
    for i in 1 2 3 4 5 6; do
        his dd if=/dev/urandom of="rests$i" bs=100K count=1 conv=fsync status=none
    done
    sync
    start_service
    look 0 pin /volume1/victim
    (close_descriptors && restless) &
    restless=$!
    wait_until test -e /volume1/photos/f1
    for verb in pin pin unpin pin pin unpin; do
        status=0
        RECORDED=$(config '[.volumes["/volume1"].files[] | select(test("/rests"))] | length')
        veskpin --json "$verb" /volume1/photos >"$ANSWER" || status=$?
        echo "$verb: $status $(answer '[.files[] | [.path, .state, .reason]], .errors')"
        if [ "$status" -eq 4 ]; then
            # He may end the receiver, in a moment that nobody can foresee, and that is said.
            wait_until service_has_lost_its_receiver
            kill -s KILL "$SERVICE_PID"
            wait "$SERVICE_PID" || true
            start_service
            continue
        fi
        [ "$status" -le 1 ]
        rests_are_told "$verb"
        secret_is pinned
    done
    touch /tmp/rest
    wait "$restless"
    veskpin --json pin /volume1/photos >"$ANSWER" || [ $? -eq 1 ]
    same 6 "$(answer '[.files[] | select((.path | test("/rests[1-6]$")) and .state == "pinned")] | length')"
    veskpin --json unpin /volume1/photos >"$ANSWER" || [ $? -eq 1 ]
    same 6 "$(answer '[.files[] | select((.path | test("/rests[1-6]$")) and .state == "unpinned")] | length')"
    secret_is pinned
    stop_service
}
service_has_lost_its_receiver() { receiver_has_ended || [ ! -e "/proc/$SERVICE_PID" ]; }
