#!/usr/bin/env bash
# The story of one token: acquired, exchanged, renewed, validated, inspected, and refused once a
# byte of it has changed. Needs `ssoclient` and `ssoclient-devsts` in PATH; `./run demo` sees to it.
set -euo pipefail

fail() {
    printf 'demo.sh: %s\n' "$*" >&2
    exit 1
}

# Prints a command as it would be typed, and runs it.
show() {
    printf '\n$ %s\n' "$*"
    "$@"
}

# A refusal is what is wanted: anything but exit code 1 ends the demo as failed.
show_refused() {
    local status=0
    show "$@" || status=$?
    printf '(exit code %d)\n' "$status"
    ((status == 1)) || fail 'this should have been refused'
}

folder=$(mktemp -d)
server=
clean_up() {
    if [[ -n $server ]]; then
        kill "$server" 2>/dev/null || true
        wait "$server" 2>/dev/null || true
    fi
    rm -rf "$folder"
}
trap clean_up EXIT
trap 'exit 130' INT TERM HUP
cd "$folder"

# Starts the development STS in the background and sets `url` once it listens.
url=
start_server() {
    ssoclient-devsts --state . >server.log 2>&1 </dev/null &
    server=$!
    while [[ -z $url ]]; do
        kill -0 "$server" 2>/dev/null || { cat server.log; fail 'the server did not start'; }
        url=$(sed -n 's/^listening on //p' server.log)
        sleep 0.1
    done
}

# The command line, with the options that every request of the demo needs.
sso() { ssoclient "$@" --url "$url" --ca ca.pem --trust sts.pem; }

printf '\n1. A token service for development starts, with keys and users of its own.\n'
printf '\n$ ssoclient-devsts --state . &\n'
start_server
cat server.log
sed -n '/"alice@example.test"/,/}/s/.*"password": "\(.*\)".*/\1/p' users.json >password
printf "\n\$ sso() { ssoclient \"\$@\" --url %s --ca ca.pem --trust sts.pem; }\n" "$url"

printf '\n2. A user name and a password become a verified token, over HTTPS.\n'
show sso acquire password --user alice@example.test --password-file password \
    --delegable --out alice.xml

printf '\n3. A service acquires a token for itself with its own key, to which it is bound.\n'
show sso acquire certificate --key client.key --cert client.pem --renewable --out service.xml

printf "\n4. It exchanges Alice's token for one with which it may act for her.\n"
show sso acquire token --token alice.xml --key client.key --cert client.pem \
    --delegate-to service@example.test --out delegated.xml

printf '\n5. It renews its own token.\n'
show sso renew --token service.xml --lifetime 900 --key client.key --cert client.pem \
    --out renewed.xml

printf '\n6. The token service says whether the delegated token is still good.\n'
show sso validate --token delegated.xml

printf '\n7. The saved token is verified once more, without the service.\n'
show ssoclient inspect delegated.xml --trust sts.pem

printf '\n8. With one byte changed it is refused.\n'
printf "\n\$ sed 's/Administrators/Administrator5/' delegated.xml >changed.xml\n"
sed 's/Administrators/Administrator5/' delegated.xml >changed.xml
! cmp --quiet delegated.xml changed.xml || fail 'no byte was changed'
show_refused ssoclient inspect changed.xml --trust sts.pem

printf '\nThe service stops, and its folder goes.\n'
