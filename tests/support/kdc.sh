#!/usr/bin/env bash
# A Kerberos realm of its own for a test: a key distribution centre on a free loopback port, its
# database, principals and keytabs in one folder.
#
#   kdc.sh start FOLDER   makes all that, and returns when the KDC answers
#   kdc.sh stop FOLDER    ends the KDC
#
# FOLDER then has, besides the KDC's own files:
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

# Somebody else may take a port between its choice and its use, hence the tries.
start_kdc() {
    local port try
    for try in 1 2 3 4 5; do
        port=$((20000 + RANDOM % 12000))
        ! is_listening "$port" || continue
        write_configuration "$port"
        [[ -e $folder/principal ]] || make_database
        krb5kdc -r "$realm" -P "$folder/kdc.pid" >>"$folder/kdc.out" 2>&1 </dev/null || continue
        # It listens when it goes into the background, and says there which process it is.
        until [[ -s $folder/kdc.pid ]]; do sleep 0.01; done
        is_listening "$port" && return
        stop_kdc
    done
    cat "$folder"/kdc.out "$folder"/kdc.log >&2
    fail "the KDC did not start in $try tries"
}

stop_kdc() {
    [[ -s $folder/kdc.pid ]] || return 0
    local pid
    pid=$(<"$folder/kdc.pid")
    kill "$pid" 2>/dev/null || true
    rm -f "$folder/kdc.pid"
}

[[ $# -eq 2 ]] || fail 'usage: kdc.sh start|stop FOLDER'
folder=$(cd "$2" && pwd)
export KRB5_CONFIG=$folder/krb5.conf KRB5_KDC_PROFILE=$folder/kdc.conf
case $1 in
    start) start_kdc ;;
    stop) stop_kdc ;;
    *) fail "unknown command $1" ;;
esac
