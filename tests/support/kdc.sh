#!/usr/bin/env bash
# A Kerberos realm of its own for a test: a key distribution centre on a free loopback port, its
# database, principals and keytabs in one folder.
#
# It prints the path of the folder when the KDC answers, and waits for the end of its standard
# input. Then it ends the KDC and removes the folder, so that none outlives whoever holds the other
# end of a pipe to it. Start it by `setsid --fork`, which spares it what kills a test's processes.
#
# The folder has, besides the KDC's own files:
#   krb5.conf        for KRB5_CONFIG
#   service.keytab   HTTP/127.0.0.1 and HTTP/localhost, the token service
#   alice.keytab     alice, whom the sample users of the token service know
#   mallory.keytab   mallory, whom they do not know
#   alice.password   alice's password
set -euo pipefail

readonly realm=EXAMPLE.TEST
PATH=$PATH:/usr/sbin:/sbin

fail() {
    printf 'kdc.sh: %s\n' "$*" >&2
    exit 1
}

# TCP only: a port that is free for TCP may be taken for UDP.
write_configuration() {
    local port=$1
    cat >"$folder/krb5.conf" <<END
[libdefaults]
    default_realm = $realm
    dns_lookup_kdc = false
    dns_lookup_realm = false
    dns_canonicalize_hostname = false
    rdns = false
    udp_preference_limit = 1
    kdc_timeout = 5000
    default_ccache_name = FILE:$folder/no-default-ccache
    default_keytab_name = FILE:$folder/no-default-keytab
    default_client_keytab_name = FILE:$folder/no-default-client-keytab

[realms]
    $realm = {
        kdc = 127.0.0.1:$port
    }

[domain_realm]
    localhost = $realm
    127.0.0.1 = $realm
END
    cat >"$folder/kdc.conf" <<END
[kdcdefaults]
    kdc_listen = ""
    kdc_tcp_listen = 127.0.0.1:$port

[realms]
    $realm = {
        database_name = $folder/principal
        key_stash_file = $folder/stash
        acl_file = $folder/kadm5.acl
        max_life = 10h
        supported_enctypes = aes256-cts-hmac-sha1-96:normal aes256-cts-hmac-sha384-192:normal
    }

[logging]
    kdc = FILE:$folder/kdc.log
    admin_server = FILE:$folder/kadmin.log
    default = FILE:$folder/default.log
END
}

administer() { kadmin.local -r "$realm" -q "$*" >>"$folder/kadmin.out" 2>&1; }

make_database() {
    local password
    password=$(openssl rand -hex 16)
    (umask 077 && printf '%s' "$password" >"$folder/alice.password")
    kdb5_util -r "$realm" create -s -P "$(openssl rand -hex 16)" >>"$folder/kadmin.out" 2>&1
    administer "addprinc -pw $password alice"
    administer 'addprinc -randkey mallory'
    administer 'addprinc -randkey HTTP/127.0.0.1'
    administer 'addprinc -randkey HTTP/localhost'
    administer "ktadd -norandkey -k $folder/alice.keytab alice"
    administer "ktadd -k $folder/mallory.keytab mallory"
    administer "ktadd -k $folder/service.keytab HTTP/127.0.0.1 HTTP/localhost"
    [[ -s $folder/service.keytab && -s $folder/alice.keytab && -s $folder/mallory.keytab ]] \
        || { cat "$folder/kadmin.out" >&2; fail 'the keytabs could not be made'; }
}

is_listening() { (exec 3<>"/dev/tcp/127.0.0.1/$1") 2>/dev/null; }

# It listens when it says which process it is.
await_kdc() {
    local count
    for ((count = 0; count < 3000; ++count)); do
        [[ ! -s $folder/kdc.pid ]] || return 0
        kill -0 "$kdc" 2>/dev/null || return 1
        sleep 0.01
    done
    return 1
}

# Somebody else may take a port between its choice and its use, hence the tries.
start_kdc() {
    local port try
    for try in 1 2 3 4 5; do
        port=$((20000 + RANDOM % 12000))
        ! is_listening "$port" || continue
        write_configuration "$port"
        [[ -e $folder/principal ]] || make_database
        krb5kdc -n -r "$realm" -P "$folder/kdc.pid" >>"$folder/kdc.out" 2>&1 </dev/null &
        kdc=$!
        ! await_kdc || return 0
        stop_kdc
    done
    cat "$folder"/kdc.out "$folder"/kdc.log >&2
    fail "the KDC did not start in $try tries"
}

stop_kdc() {
    [[ -n $kdc ]] || return 0
    kill "$kdc" 2>/dev/null || true
    wait "$kdc" || true
    kdc=
    rm -f "$folder/kdc.pid"
}

clean_up() {
    stop_kdc
    rm -rf "$folder"
}

[[ $# -eq 0 ]] || fail 'usage: kdc.sh'
kdc=
folder=$(mktemp -d "${TMPDIR:-/tmp}/test-kdc-XXXXXX")
trap clean_up EXIT
export KRB5_CONFIG=$folder/krb5.conf KRB5_KDC_PROFILE=$folder/kdc.conf
start_kdc
printf '%s\n' "$folder"
cat >/dev/null
