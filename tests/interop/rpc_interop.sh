#!/bin/sh
# Lets two programs of other makers judge the host's RPC: impacket's DCE/RPC client transfers a file
# over TCP, and tshark reads the conversation without finding anything malformed or unknown.
#
#   tests/interop/rpc_interop.sh BUILD_DIR
#
# Ends with status 77 when one of the programs is not there.
set -eu
here=$(cd "$(dirname "$0")" && pwd)
build=$1
python=/usr/bin/python3

skip() {
    echo "skipped: $1"
    exit 77
}
"$python" -c 'import impacket' 2>/dev/null || skip 'the Python package impacket is not installed'
command -v tshark >/dev/null || skip 'tshark is not installed'

scratch=$(mktemp -d)
host=
finish() {
    [ -z "$host" ] || { kill "$host" && wait "$host"; } 2>/dev/null || true
    rm -rf "$scratch"
}
trap finish EXIT
trap 'exit 130' INT TERM
fail() {
    echo "failed: $1" >&2
    exit 1
}

# --- a host -------------------------------------------------------------------------------------
mkdir -p "$scratch/depot" "$scratch/home/bin" "$scratch/home/config" "$scratch/home/logs"
for program in TovrinAgent cinfo uninstall.sh; do
    printf '#!/bin/sh\nexit 0\n' >"$scratch/home/bin/$program"
    chmod +x "$scratch/home/bin/$program"
done
touch "$scratch/host.log"
port=$("$python" -c 'import socket; print(socket.create_server(("127.0.0.1", 0)).getsockname()[1])')
QVSDEPLOY_AGENTDEPOT="$scratch/depot" "$build/bin/zavhost" --home "$scratch/home" \
    --socket "$scratch/host.sock" --rpc-port "$port" >"$scratch/host.log" 2>&1 &
host=$!
tries=0
until grep -q ready: "$scratch/host.log"; do
    tries=$((tries + 1))
    [ "$tries" -lt 200 ] || fail "the host is not ready: $(cat "$scratch/host.log")"
    sleep 0.05
done

# --- impacket -----------------------------------------------------------------------------------
head -c 1500001 /dev/urandom >"$scratch/source"
answer=$("$python" -B "$here/impacket_client.py" "$port" "$scratch/source" 'from\elsewhere' \
    "$scratch/capture") || fail 'the transfer with impacket'
port_in_capture=${answer% *}
calls=${answer#* }
sent=$(sha256sum <"$scratch/source")
arrived=$(sha256sum <"$scratch/depot/from/elsewhere") || fail 'nothing arrived'
[ "$sent" = "$arrived" ] || fail 'what arrived is not what was sent'
echo "impacket: 1500001 bytes in $calls calls, same checksum"

# --- tshark -------------------------------------------------------------------------------------
read_capture() {
    tshark -r "$scratch/capture" -d "tcp.port==$port_in_capture,dcerpc" "$@" 2>"$scratch/tshark.log" ||
        fail "tshark: $(cat "$scratch/tshark.log")"
}
count() { read_capture -Y "$1" -T fields -e dcerpc.pkt_type | tr ',' '\n' | grep -cx "$2" || true; }

read_capture -Y '_ws.malformed || _ws.unreassembled || _ws.expert.severity >= 0x600000' >"$scratch/bad"
[ ! -s "$scratch/bad" ] || fail "tshark finds packets malformed: $(cat "$scratch/bad")"
total() { read_capture -T fields -e "$1" | tr ',' '\n' | awk '{ sum += $1 } END { print sum }'; }
[ "$(total dcerpc.cn_frag_len)" -eq "$(total tcp.len)" ] ||
    fail 'tshark finds bytes that belong to no DCE/RPC packet'
read_capture -Y dcerpc -O dcerpc >"$scratch/read"
if grep -iE 'unknown|malformed|bogus|undecoded' "$scratch/read" >"$scratch/bad"; then
    fail "tshark does not understand: $(cat "$scratch/bad")"
fi
[ "$(count dcerpc 11)" -eq 4 ] || fail 'tshark does not see four binds'
[ "$(count dcerpc 12)" -eq 4 ] || fail 'tshark does not see four answers to binds'
[ "$(count dcerpc 3)" -eq 2 ] || fail 'tshark does not see two faults'
[ "$(count dcerpc 2)" -eq $((calls + 1)) ] || fail 'tshark does not see all responses'
[ "$(count dcerpc 0)" -gt $((calls + 3)) ] || fail 'tshark does not see requests of many fragments'
interfaces=$(read_capture -Y 'dcerpc.pkt_type == 11' -T fields -e dcerpc.cn_bind_to_uuid | sort -u)
echo "$interfaces" | grep -qx 'b1fb0fb3-03c4-0000-0200-000935183d00' ||
    fail "tshark reads other interfaces: $interfaces"
echo "tshark: $(count dcerpc 0) request fragments, $(count dcerpc 2) responses, nothing unknown"
