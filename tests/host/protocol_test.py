"""The protocol of docs/protocol.md, from a client that shares no code with the library."""

import os
import pathlib
import resource
import socket
import struct
import threading
import time
import unittest

import vexg_client
from support import PipeTest

SUM = ('<Job><Command Name="s" ID="ExampleSumCommand"><Input Values="1:2 [1 2] "/></Command></Job>')


def wait_job(channel, seconds):
    return (f'<Job>{channel.element}<Command Name="w" ID="ExampleWaitCommand">'
            f'<Input Seconds="{seconds}"/></Command>'
            '<Command Name="after" ID="ExampleSumCommand"><DependsOn Name="w"/></Command></Job>')


class Protocol(PipeTest):
    def setUp(self):
        super().setUp()
        self.serve()

    def channel(self):
        channel = vexg_client.Channel(f"vexg-test-{os.getpid()}")
        self.addCleanup(channel.close)
        return channel

    def test_a_job_and_its_result(self):
        client = vexg_client.Client("test")
        self.assertEqual(client.private, "test_SERVER_00000000")
        for _ in range(3):
            self.assertEqual(client.submit(SUM)["s"]["return"], {"Count": "2", "Sum": "3"})
        self.assertEqual(vexg_client.ask(client.private, ""), "@ERROR")
        client.close()
        self.assertEqual(vexg_client.Client("test").private, "test_SERVER_00000001")

    def test_progress_and_abort_through_shared_memory(self):
        client = vexg_client.Client("test")
        channel = self.channel()
        results = {}
        job = threading.Thread(target=lambda: results.update(client.submit(wait_job(channel, 60))))
        job.start()
        while not 0.0 < channel.progress() < 1.0:
            time.sleep(0.005)
        raised = time.monotonic()
        channel.abort()
        job.join()
        self.assertLess(time.monotonic() - raised, 2.0)
        self.assertEqual(results["after"]["Result"], "Aborted")
        self.assertEqual(channel.progress(), 1.0)

    def test_a_large_job_comes_back_whole(self):
        values = " ".join(str(i) for i in range(300_000))
        job = (f'<Job><Command Name="s" ID="ExampleSumCommand"><Input Values="1:300000 [{values}] "/>'
               "</Command>" + '<Command Name="x" ID="ExampleSumCommand"/>' * 2000 + "</Job>")
        results = vexg_client.Client("test").submit(job)
        self.assertEqual(float(results["s"]["return"]["Sum"]), sum(range(300_000)))
        self.assertEqual(results["x"]["Result"], "Failed")

    def test_bad_clients_keep_nobody_waiting(self):
        client = vexg_client.Client("test")
        bad = []
        for name in ("test", client.private):
            bad.append(vexg_client.connect(name))  # says nothing
            bad.append(vexg_client.connect(name))
            bad[-1].sendall(b"\x05\0")  # breaks off in the length
            bad.append(vexg_client.connect(name))
            vexg_client.send(bad[-1], SUM if name == client.private else "@NEW")  # never reads
            bad.append(vexg_client.connect(name))
            bad[-1].sendall(struct.pack("<I", (256 << 20) + 1))  # announces too much
            self.assertEqual(bad[-1].recv(1), b"")
        self.assertEqual(client.submit(SUM)["s"]["Result"], "Success")
        self.assertEqual(vexg_client.Client("test").submit(SUM)["s"]["Result"], "Success")
        for pipe in bad:
            pipe.close()
        self.assertIsNone(self.server.poll())

    def test_two_hundred_clients_at_once(self):
        clients = [vexg_client.Client("test") for _ in range(200)]
        failed = []

        def work(client):
            if client.submit(SUM)["s"]["Result"] != "Success":
                failed.append(client)

        threads = [threading.Thread(target=work, args=(client,)) for client in clients]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        self.assertEqual(failed, [])
        for client in clients:
            client.close()

    def test_an_idle_server_uses_no_processor_time(self):
        clients = [vexg_client.Client("test") for _ in range(20)]
        stat = pathlib.Path(f"/proc/{self.server.pid}/stat")

        def ticks():
            fields = stat.read_text().rsplit(")", 1)[1].split()
            return int(fields[11]) + int(fields[12])

        clients[0].submit(SUM)
        before = ticks()
        time.sleep(1.0)
        self.assertLessEqual(ticks() - before, 1)


class WithoutDescriptors(PipeTest):
    def test_running_out_of_them_refuses_clients_and_kills_nothing(self):
        self.serve(preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_NOFILE, (40, 40)))
        held = []
        for _ in range(60):
            pipe = socket.socket(socket.AF_UNIX)
            pipe.connect(vexg_client.pipe_path("test"))
            held.append(pipe)
        # Those that were let in are silent, those that were not are closed.
        deadline = time.monotonic() + 10
        closed = 0
        while closed == 0 and time.monotonic() < deadline:
            closed = 0
            for pipe in held:
                pipe.setblocking(False)
                try:
                    closed += pipe.recv(1) == b""
                except BlockingIOError:
                    pass
                except ConnectionError:
                    closed += 1
        self.assertGreater(closed, 0)
        for pipe in held:
            pipe.close()
        self.assertEqual(vexg_client.Client("test").submit(SUM)["s"]["Result"], "Success")


if __name__ == "__main__":
    unittest.main()
