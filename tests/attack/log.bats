#!/usr/bin/env bats
# Names that a user chooses, in the messages of what runs as root.

load lib

setup_file() { make_volume 1 64M 16M ext4; }

setup() { fresh_volume; }

@test "no name begins a line of the log or gives orders to a terminal" {
    local name=$'x\nveskcachepinfiletool: Handle request (type=pinFiles files=y#1) OK \e[2J\x7f'
    local shown='x\x0aveskcachepinfiletool: Handle request (type=pinFiles files=y#1) OK \x1b[2J\x7f'
    attacker_folder /volume1/home
    says 255 --pin-files "/volume1/home/$name" --mount-path /volume1 <<END
: File (path /volume1/home/$shown) doesn't exist
: Check file paths error
: Check parameter failed
$(usage)
END
    name=$'x\e[2J\x7f' shown='x\x1b[2J\x7f'
    # shellcheck disable=SC2016
    attacker sh -c 'echo >"$1"' - "/volume1/home/$name"
    start_service
    tool --pin-files "/volume1/home/$name" --mount-path /volume1
    wait_until request_is_done 0
    service_said <<<": Handle request (type=pinFiles files=home/$shown#$(inode "home/$name")) OK "
}
