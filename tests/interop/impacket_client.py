"""Transfers a file to a host with impacket's DCE/RPC client, after trying what the host must refuse.

    impacket_client.py PORT SOURCE NAME CAPTURE

PORT is the host's RPC port on loopback. The conversations are written to CAPTURE; standard output
says which port the host has there, and how many requests of how many chunks were sent.
"""

import struct
import sys

from impacket.dcerpc.v5 import transport
from impacket.dcerpc.v5.rpcrt import DCERPCException
from impacket.uuid import uuidtup_to_bin

from recording_proxy import RecordingProxy

INTERFACE = ("b1fb0fb3-03c4-0000-0200-000935183d00", "1.0")
CHUNK = 4096
BATCH = 100


def connect(port, interface=INTERFACE):
    rpc = transport.DCERPCTransportFactory(f"ncacn_ip_tcp:127.0.0.1[{port}]").get_dce_rpc()
    rpc.connect()
    rpc.bind(uuidtup_to_bin(interface))
    return rpc


def parameters(name, first, chunks):
    text = name.encode() + b"\0"
    head = struct.pack("<IIII", 0, len(text), 0, len(text)) + text
    head += b"\0" * (-len(head) % 4)
    head += struct.pack("<IiiHxx", 0, 1 if first else 0, len(chunks) - 1, len(chunks))
    return head + b"".join(
        struct.pack("<I", len(chunk)) + chunk.ljust(CHUNK, b"\0") for chunk in chunks)


def call(rpc, body, operation=0):
    rpc.call(operation, body)
    return struct.unpack("<i", rpc.recv())[0]


def must_fail(what, words, action):
    try:
        action()
    except DCERPCException as refusal:
        if words in str(refusal):
            return
        sys.exit(f"{what}: refused with '{refusal}', not with '{words}'")
    sys.exit(f"{what}: not refused")


def try_what_is_refused(port):
    unknown = ("12345678-1234-abcd-ef00-0123456789ab", "1.0")
    must_fail("an unknown interface", "abstract_syntax_not_supported",
              lambda: connect(port, unknown))
    must_fail("an unknown version", "abstract_syntax_not_supported",
              lambda: connect(port, (INTERFACE[0], "2.0")))
    rpc = connect(port)
    must_fail("an unknown operation", "nca_s_op_rng_error", lambda: call(rpc, b"", 1))
    must_fail("a request cut short", "rpc_x_bad_stub_data",
              lambda: call(rpc, parameters("cut", True, [b"x"])[:-1]))
    status = call(rpc, parameters("../outside", True, [b"x"]))
    if status != 6:
        sys.exit(f"a name that leads out of the depot: status {status}")
    rpc.disconnect()


def transfer(port, source, name):
    with open(source, "rb") as file:
        content = file.read()
    chunks = [content[at:at + CHUNK] for at in range(0, len(content), CHUNK)]
    rpc = connect(port)
    for at in range(0, len(chunks), BATCH):
        status = call(rpc, parameters(name, at == 0, chunks[at:at + BATCH]))
        if status != 0:
            sys.exit(f"the batch at chunk {at} ended with status {status}")
    rpc.disconnect()
    return -(-len(chunks) // BATCH)


def main():
    port, source, name, capture = sys.argv[1:]
    proxy = RecordingProxy(int(port))
    try_what_is_refused(proxy.port)
    calls = transfer(proxy.port, source, name)
    proxy.write_capture(capture)
    print(proxy.port, calls)


main()
