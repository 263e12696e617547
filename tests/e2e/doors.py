"""The ways by which SOAP clients of other makes reach an agent. Each is an address of the service's description, and
that is all a client is told: where the service is stands in the description."""

import socket
import threading

from programs import ProgramTest, disk

FLASH, FLASH2, USB, PARTED = "naa.f1", "naa.f2", "naa.u1", "naa.p1"
DISKS = [disk(FLASH, True), disk(FLASH2, True), *[disk(f"naa.c{i}") for i in range(1, 5)],
         disk(USB, transport="usb"), disk(PARTED, partitions=2)]
HOST = {"name": "a", "faultDomain": "rack-1",
        "cluster": {"enabled": True, "clusterUuid": "c-1", "nodeUuid": "n-1"}, "disks": DISKS}
HALF_FAILS = {**HOST, "faults": [{"operation": "FormatDiskMapping", "call": 2, "exception": "KovaStorageException",
                                  "disk": "naa.c2", "message": "it does not answer"}]}
GONE = {"name": "a", "disks": [DISKS[0], disk("naa.c1", absent=True, kovaUuid="52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e",
                                              formatVersion=3), DISKS[3]],
        "groups": [{"ssd": FLASH, "capacity": ["naa.c1", "naa.c2"]}]}


class Bridge:
    """A port of this host that leads to a socket file, which may be another one for each connection. For clients that
    know no socket files."""

    def __init__(self):
        self.target = None
        self.listener = socket.create_server(("127.0.0.1", 0))
        self.port = self.listener.getsockname()[1]
        threading.Thread(target=self._accept, daemon=True).start()

    def close(self):
        self.listener.shutdown(socket.SHUT_RDWR)  # which wakes who accepts
        self.listener.close()

    def _accept(self):
        while True:
            try:
                client, _ = self.listener.accept()
            except OSError:
                return
            threading.Thread(target=self._serve, args=(client,), daemon=True).start()

    def _serve(self, client):
        with client, socket.socket(socket.AF_UNIX) as agent:
            agent.connect(self.target)
            back = threading.Thread(target=self._pass_on, args=(agent, client), daemon=True)
            back.start()
            self._pass_on(client, agent)
            back.join()

    @staticmethod
    def _pass_on(source, sink):
        try:
            while data := source.recv(65536):
                sink.sendall(data)
            sink.shutdown(socket.SHUT_WR)
        except OSError:
            pass  # either side has gone; the other one is told by its own end


class DoorsTest(ProgramTest):
    """Starts agents, and tells where their description is."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.bridge = Bridge()
        cls.addClassCleanup(cls.bridge.close)

    def through_a_bridge(self, host):
        """A client here has the rights of whoever runs this."""
        self.start_agent("--host", self.write("host.json", host))
        self.bridge.target = self.socket
        return f"http://127.0.0.1:{self.bridge.port}/soap?wsdl"

    def over_tcp(self, host):
        """A client here may read."""
        self.start_agent("--host", self.write("host.json", host), "--listen", "tcp:127.0.0.1:0")
        return f"http://127.0.0.1:{self.tcp_port()}/soap?wsdl"

    def over_tls(self, host):
        """A client here must know ca.pem, and may change with client.pem and client.key."""
        self.make_ca("ca")
        self.issue("server", "ca", "/CN=kova", "subjectAltName=DNS:localhost")
        self.issue("client", "ca", "/CN=operator")
        self.start_agent("--host", self.write("host.json", host), "--listen", "tcp:127.0.0.1:0", "--tls-cert",
                         "server.pem", "--tls-key", "server.key", "--tls-client-ca", "ca.pem", "--change-name", "operator")
        return f"https://localhost:{self.tcp_port()}/soap?wsdl"

    def tcp_port(self):
        return int(self.addresses[1].rpartition(":")[2])


class ClientTest(DoorsTest):
    """Scenes that a client in another language plays on its own: `command` and the address of the description, then the
    scene. Whatever it finds wrong stands in its error output."""

    command = None

    def play(self, scene, wsdl):
        done = self.run_program(*self.command, wsdl, scene)
        self.assertEqual((done.status, done.err), (0, ""), done.out)


class Scenes:
    """To be mixed into a ClientTest."""

    def test_tells_the_whole_story(self):
        self.play("story", self.through_a_bridge(HOST))

    def test_reads_typed_faults(self):
        self.play("faults", self.through_a_bridge(HOST))

    def test_is_told_which_part_failed(self):
        self.play("part", self.through_a_bridge(HALF_FAILS))

    def test_removes_a_disk_that_has_left(self):
        self.play("absent", self.through_a_bridge(GONE))

    def test_reads_over_tcp(self):
        self.play("read", self.over_tcp(HOST))
