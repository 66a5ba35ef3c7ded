#!/usr/bin/env bash
# Runs inside a bare system: installs the packages of its first argument, uses each, removes them.
# Its second argument has the programs of other projects.
set -euo pipefail
packages=$1
consumers=$2
export DEBIAN_FRONTEND=noninteractive

fail() {
    printf 'bareRoot.sh: %s\n' "$*" >&2
    exit 1
}

cd "$(mktemp -d)"
apt-get install --yes --no-install-recommends --option DPkg::Options::=--force-unsafe-io \
    "$packages"/*.deb g++ pkg-config

printf '\nThe development STS and the command line\n'
: >server.log # so that it can be read before the server has written to it
ssoclient-devsts --state . --listen 127.0.0.1:0 >>server.log 2>&1 </dev/null &
server=$!
url=
while [[ -z $url ]]; do
    kill -0 "$server" 2>/dev/null || fail "the server did not start: $(cat server.log)"
    url=$(sed -n 's/^listening on //p' server.log)
    sleep 0.1
done
sed -n '/"alice@example.test"/,/}/s/.*"password": "\(.*\)".*/\1/p' users.json >password
ssoclient acquire password --url "$url" --ca ca.pem --trust sts.pem --user alice@example.test \
    --password-file password --out token.xml
ssoclient inspect token.xml --trust sts.pem
kill "$server"

printf '\nThe development files\n'
# expect PACKAGE PROGRAM TEXT: the program says this when it was built with the package.
expect() {
    local flags
    read -r -a flags <<<"$(pkg-config --cflags --libs "$1")"
    g++ -std=c++17 "$consumers/$2.cpp" -o "$2" "${flags[@]}"
    "./$2" | tee says
    grep --quiet "$3" says || fail "$2 says something else than $3"
}
expect quillon quillon_consumer '^aW5zdGFsbGVk$'
expect ssoclient consumer '^XMLParseException$'
expect ssoclient-gss gss_consumer '/no/keytab'
expect ssoclient-runtime runtime_consumer '^SsoException: nobody gives any$'

printf '\nRemoved again\n'
names=()
for file in "$packages"/*.deb; do names+=("$(dpkg-deb --field "$file" Package)"); done
dpkg --listfiles "${names[@]}" >files
grep --quiet '/usr/bin/ssoclient$' files || fail 'the packages hold no command line'
apt-get purge --yes "${names[@]}"
while IFS= read -r file; do
    [[ -d $file || ! -e $file ]] || fail "$file was left"
done <files
! compgen -G '/usr/*/ssoclient*' || fail 'a folder was left'
