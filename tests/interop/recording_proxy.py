"""A TCP proxy on loopback that keeps what both sides say and writes it down as a capture file."""

import socket
import struct
import threading

SYN, ACK, PUSH = 0x02, 0x10, 0x08
LINK_TYPE_IP = 101


class RecordingProxy:
    """Forwards connections to a port, until the process ends."""

    def __init__(self, target_port):
        self._target_port = target_port
        self._listener = socket.create_server(("127.0.0.1", 0))
        self.port = self._listener.getsockname()[1]
        self._lock = threading.Lock()
        self._segments = []  # (client's port, True for the client's bytes, bytes)
        threading.Thread(target=self._accept, daemon=True).start()

    def _accept(self):
        while True:
            client, address = self._listener.accept()
            host = socket.create_connection(("127.0.0.1", self._target_port))
            for source, sink, from_client in ((client, host, True), (host, client, False)):
                threading.Thread(target=self._forward, daemon=True,
                                 args=(source, sink, address[1], from_client)).start()

    def _forward(self, source, sink, client_port, from_client):
        try:
            while data := source.recv(16384):
                with self._lock:
                    self._segments.append((client_port, from_client, data))
                sink.sendall(data)
            sink.shutdown(socket.SHUT_WR)
        except OSError:
            pass  # the other side has gone

    def write_capture(self, path):
        """Writes all connections, each with a handshake before it."""
        with self._lock:
            segments = list(self._segments)
        with open(path, "wb") as capture:
            capture.write(struct.pack("<IHHiIII", 0xA1B2C3D4, 2, 4, 0, 0, 65535, LINK_TYPE_IP))
            conversations = {}
            for number, (client_port, from_client, data) in enumerate(segments):
                if client_port not in conversations:
                    conversations[client_port] = {True: 1, False: 1}
                    for packet in self._handshake(client_port):
                        self._put(capture, number, packet)
                sent = conversations[client_port]
                self._put(capture, number, self._packet(client_port, from_client, sent[from_client],
                                                        sent[not from_client], ACK | PUSH, data))
                sent[from_client] += len(data)

    def _handshake(self, client_port):
        return (self._packet(client_port, True, 0, 0, SYN, b""),
                self._packet(client_port, False, 0, 1, SYN | ACK, b""),
                self._packet(client_port, True, 1, 1, ACK, b""))

    def _packet(self, client_port, from_client, sequence, acknowledged, flags, data):
        ports = (client_port, self.port) if from_client else (self.port, client_port)
        tcp = struct.pack(">HHIIBBHHH", *ports, sequence, acknowledged, 5 << 4, flags, 65535, 0, 0)
        loopback = socket.inet_aton("127.0.0.1")
        ip = struct.pack(">BBHHHBBH4s4s", 0x45, 0, 20 + len(tcp) + len(data), 0, 0, 64, 6, 0,
                         loopback, loopback)
        return ip + tcp + data

    @staticmethod
    def _put(capture, number, packet):
        capture.write(struct.pack("<IIII", number // 1000, number % 1000 * 1000, len(packet),
                                  len(packet)))
        capture.write(packet)
