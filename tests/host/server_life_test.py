"""What a server that many clients share must outlive, and how it ends: seen from outside."""

import json
import mmap
import os
import pathlib
import resource
import signal
import socket
import subprocess
import tempfile
import threading
import time
import unittest
import unittest.mock
import xml.etree.ElementTree as ElementTree

import vexg_client
from support import EXAMPLES, SANITIZED, SOURCE, VEXG, PipeTest, run, start, write_orva

WAIT = '<Command Name="w" ID="ExampleWaitCommand"><Input Seconds="60"/></Command>'
SUM = '<Job><Command Name="s" ID="ExampleSumCommand"><Input Values="1:2 [1 2] "/></Command></Job>'


def command(name, kind, **inputs):
    texts = "".join(f'<Input {key}="{value}"/>' for key, value in inputs.items())
    return f'<Job><Reasons/><Command Name="{name}" ID="{kind}">{texts}</Command></Job>'


class Block:
    """Named memory as a client makes it."""

    def __init__(self, name, size, sparse=False):
        self.name, self.size = name, size
        self.path = pathlib.Path("/dev/shm") / name
        with open(self.path, "wb") as file:
            file.truncate(size) if sparse else file.write(bytes(size))

    def cut(self):
        os.truncate(self.path, 0)


class Server(PipeTest):
    def setUp(self):
        super().setUp()
        made = tempfile.TemporaryDirectory()
        self.addCleanup(made.cleanup)
        self.folder = pathlib.Path(made.name)
        self.scene = write_orva(self.folder / "scene.dat", 40, 30, 3, bytes(range(240)) * 15)

    def block(self, name, size, sparse=False):
        block = Block(f"vexg-life-{os.getpid()}-{name}", size, sparse)
        self.addCleanup(lambda: block.path.unlink(missing_ok=True))
        return block

    def alive(self):
        self.assertIsNone(self.server.poll())
        self.assertEqual(vexg_client.Client("test").submit(SUM)["s"]["Result"], "Success")

    def jobs(self):
        return json.loads(run("jobs", "test", "--json")[1])

    def until(self, holds, seconds=20):
        deadline = time.monotonic() + seconds
        while not holds():
            self.assertLess(time.monotonic(), deadline)
            time.sleep(0.02)

    def open_raster(self, client, path=None, **inputs):
        return client.submit(command("o", "OpenRasterCommand", ConnStr=path or self.scene, **inputs))["o"]


class Stop(Server):
    def test_a_stop_among_busy_clients_ends_with_0_and_leaves_nothing(self):
        temporary = self.folder / "temporary"
        temporary.mkdir()
        for wait in (vexg_client.connect, vexg_client.ask):  # a server that has gone stays so
            self.enterContext(unittest.mock.patch.object(wait, "__defaults__", (1.0,)))
        for end in ("word", signal.SIGTERM, signal.SIGINT):
            self.serve()
            ended = threading.Event()

            def work():
                try:
                    client = vexg_client.Client("test")
                    self.open_raster(client)
                    client.submit(command("t", "CreateTempRasterCommand", Directory=temporary, Samples=9,
                                          Lines=9, Bands=1, DataType="Byte"))
                    while not ended.is_set():
                        vexg_client.ask(client.private, SUM)
                except (ConnectionError, FileNotFoundError, ElementTree.ParseError):
                    pass

            clients = [threading.Thread(target=work) for _ in range(4)]
            for client in clients:
                client.start()
            self.until(lambda: len(list(temporary.iterdir())) >= 4)
            if end == "word":
                self.assertEqual(run("stop", "test")[0], 0)
            else:
                self.server.send_signal(end)
            code = self.server.wait(timeout=30)
            ended.set()
            for client in clients:
                client.join()
            self.assertEqual((code, self.server.stderr.read()), (0, ""), end)
            self.assertEqual(list(temporary.iterdir()), [])
            self.assertEqual(self.pipes(), [])
            self.server.communicate()

    def test_a_socket_of_a_service_manager_outlives_the_servers_that_it_starts(self):
        folder = pathlib.Path(self.runtime.name) / "vexg"
        folder.mkdir(mode=0o700)
        with socket.socket(socket.AF_UNIX) as listener:
            listener.bind(str(folder / "test"))
            listener.listen()
            os.set_inheritable(listener.fileno(), True)
            for end in ("word", signal.SIGTERM):
                # The first client waits in the socket before there is a server.
                answers = []
                early = threading.Thread(
                    target=lambda answers=answers: answers.append(vexg_client.Client("test").submit(SUM)))
                early.start()
                self.server = subprocess.Popen(
                    ["sh", "-c", f"exec 3<&{listener.fileno()}; LISTEN_FDS=1 LISTEN_PID=$$ exec {VEXG} --load {EXAMPLES} serve test"],
                    pass_fds=[listener.fileno()], stderr=subprocess.PIPE, text=True)
                self.addCleanup(self.stop)
                early.join(30)
                self.assertEqual(answers[0]["s"]["Result"], "Success")
                self.alive()
                if end == "word":
                    self.assertEqual(run("stop", "test")[0], 0)
                else:
                    self.server.send_signal(end)
                self.assertEqual(self.server.wait(timeout=30), 0)
                self.assertTrue((folder / "test").is_socket())
                self.server.communicate()

    def test_a_new_file_is_published_and_a_large_answer_is_read_to_its_end(self):
        self.serve()
        target = self.folder / "new.dat"
        client = vexg_client.Client("test")
        made = client.submit(command("c", "CreateRasterCommand", ConnStr=target, Format="ORVA", Samples=4,
                                     Lines=3, Bands=1, DataType="Byte", Interleave="BSQ"))["c"]
        self.assertEqual(made["Result"], "Success", made)
        with vexg_client.connect(client.private) as pipe:
            vexg_client.send(pipe, SUM.replace('Name="s"', f'Name="{"s" * (4 << 20)}"'))
            pipe.recv(1, socket.MSG_PEEK)  # the answer is on its way
            self.server.terminate()
            self.assertIn('Sum="3"', vexg_client.receive(pipe))
        self.assertEqual(self.server.wait(timeout=30), 0)
        self.assertEqual((target.stat().st_size, len(list(self.folder.glob("new.dat*")))), (12, 2))


class Memory(Server):
    def get(self, client, uri, pixels, states, **inputs):
        texts = dict(URI=uri, SubRect="0 0 39 29", Bands="1:3 [0 1 2] ", Interleave="BIP",
                     PixelDataBufName=pixels.name, PixelDataBufSize=pixels.size,
                     PixelValueStateBufName=states.name, PixelValueStateBufSize=states.size)
        return client.submit(command("g", "GetRasterSubRectCommand", **(texts | inputs)))["g"]

    def test_blocks_that_shrink_fail_the_job_and_not_the_server(self):
        self.serve()
        client = vexg_client.Client("test")
        uri = self.open_raster(client)["return"]["URI"]
        failed = 0
        for attempt in range(600):
            if failed and attempt >= 30:
                break
            pixels, states = self.block("p", 3600), self.block("s", 3600)
            cutter = threading.Thread(target=lambda: (time.sleep(attempt % 30 * 1e-4), pixels.cut(), states.cut()))
            cutter.start()
            failed += self.get(client, uri, pixels, states)["Result"] == "Failed"
            cutter.join()
        self.assertGreater(failed, 0)
        channel = vexg_client.Channel(f"vexg-life-{os.getpid()}-c")
        self.addCleanup(channel.close)
        results = {}
        job = f"<Job>{channel.element}{WAIT}</Job>"
        running = threading.Thread(target=lambda: results.update(vexg_client.Client("test").submit(job)))
        running.start()
        self.until(lambda: any("ExampleWaitCommand" in job["commands"] for job in self.jobs()))
        os.truncate(channel.path, 0)
        time.sleep(0.2)
        self.assertEqual(run("abort", "test", str(self.jobs()[0]["job"]))[0], 0)
        running.join(timeout=20)
        self.assertIn("w", results)
        self.alive()

    def test_only_memory_that_is_there_for_good_is_used(self):
        self.serve()
        client = vexg_client.Client("test")
        uri = self.open_raster(client)["return"]["URI"]
        pixels, states = self.block("p", 3600, sparse=True), self.block("s", 3600)
        self.assertEqual(self.get(client, uri, pixels, states)["Result"], "Success")
        self.assertGreaterEqual(os.stat(pixels.path).st_blocks * 512, 3600)
        if os.geteuid() == 0:
            os.chown(pixels.path, 12345, 12345)
            self.assertEqual(self.get(client, uri, pixels, states)["Result"], "Failed")
        self.alive()

    def test_one_band_is_what_a_block_without_an_interleave_has(self):
        self.serve()
        client = vexg_client.Client("test")
        uri = self.open_raster(client)["return"]["URI"]
        skip = client.submit(command("v", "CreateSkipRasterCommand", SrcURI=uri, SkipX=1, SkipY=1))["v"]
        stack = client.submit(command("v", "CreateBandStackRasterCommand",
                                      SrcURI=f"1:2 [{uri}  {skip['return']['URI']} ] "))["v"]
        source = pathlib.Path(self.scene).read_bytes()
        for view, bands, want in ((skip, "1:3 [2 1 0] ", 2), (stack, "1:3 [4 0 3] ", 1)):
            for word in ("None", "bip"):
                pixels, states = self.block("p", 3600), self.block("s", 3600)
                got = self.get(client, view["return"]["URI"], pixels, states, Bands=bands, Interleave=word)
                self.assertEqual((got["Result"], got["return"].get("Return")), ("Success", "1"), got)
                self.assertEqual(pixels.path.read_bytes(), source[want::3] + bytes(2400))


class Sources(Server):
    def test_a_pipe_for_a_source_wedges_nobody_and_can_be_aborted(self):
        fifo = self.folder / "fifo.tif"
        os.mkfifo(fifo)
        self.serve()
        self.assertIn("is no file", self.open_raster(vexg_client.Client("test"), fifo)["Reason"])
        self.assertEqual(run("info", str(fifo))[0], 1)
        self.server.terminate()
        self.server.communicate(timeout=30)

        self.serve("test", "--allow", "special")
        results = {}
        for key in ("TIFF|", ""):
            hanging = vexg_client.Client("test")
            thread = threading.Thread(target=lambda: results.update(
                {key: self.open_raster(hanging, f"{key}{fifo}")}))
            thread.start()
            self.until(lambda: any("OpenRaster" in job["commands"] for job in self.jobs()))
            other = vexg_client.Client("test")
            self.assertEqual(self.open_raster(other)["Result"], "Success")
            self.assertEqual(run("abort", "test", str(self.jobs()[0]["job"]))[0], 0)
            thread.join(timeout=20)
            self.assertIn("aborted", results[key]["Reason"])
        self.server.terminate()
        self.assertEqual(self.server.wait(timeout=30), 0)

    def test_nothing_is_made_in_place_of_an_open_source(self):
        self.serve()
        client, other = vexg_client.Client("test"), vexg_client.Client("test")
        (self.folder / "link.dat").symlink_to(self.scene)
        os.link(self.scene, self.folder / "hard.dat")
        uri = self.open_raster(client)["return"]["URI"]
        view = client.submit(command("v", "CreateSkipRasterCommand", SrcURI=uri, SkipX=2, SkipY=2))["v"]
        before = self.scene.read_bytes(), pathlib.Path(f"{self.scene}.hdr").read_text()

        def make(name):
            return other.submit(command("c", "CreateRasterCommand", ConnStr=self.folder / name, Format="ORVA",
                                        Samples=2, Lines=2, Bands=1, DataType="Byte"))["c"]

        for round in ("open", "held by a view"):
            for name in ("scene.dat", "link.dat", "hard.dat"):
                made = make(name)
                self.assertEqual(made["Result"], "Failed", (round, name))
                self.assertIn("open already", made["Reason"])
            client.submit(command("x", "CloseRasterCommand", URI=uri))
        self.assertEqual(before, (self.scene.read_bytes(), pathlib.Path(f"{self.scene}.hdr").read_text()))
        client.submit(command("x", "CloseRasterCommand", URI=view["return"]["URI"]))
        self.assertEqual(make("scene.dat")["Result"], "Success")
        self.assertEqual(make("scene.dat")["Result"], "Failed")  # the one that was just made is open

    def test_a_file_made_anew_is_opened_anew(self):
        self.serve()
        holder, other = vexg_client.Client("test"), vexg_client.Client("test")
        old = self.open_raster(holder)["return"]["URI"]
        self.assertEqual(self.open_raster(other, CheckSource="Compared")["return"]["URI"], old)
        fresh = write_orva(self.folder / "fresh.dat", 40, 30, 3, bytes([9]) * 3600)
        os.replace(fresh, self.scene)
        self.assertEqual(self.open_raster(other)["return"]["URI"], old)
        new = self.open_raster(other, CheckSource="Compared")["return"]["URI"]
        self.assertEqual(new, old.removesuffix("]") + "//2]")
        self.assertEqual(self.open_raster(holder, CheckSource="Compared")["return"]["URI"], new)
        mean = run("stats", str(self.scene), "--server", "test", "--json")
        self.assertEqual(mean[0], 0, mean)
        self.assertIn('"mean": 9.0', mean[1])
        with open(self.scene, "ab") as file:  # the same file, longer
            file.write(b"x")
        self.assertEqual(self.open_raster(holder, CheckSource="Compared")["return"]["URI"],
                         old.removesuffix("]") + "//3]")


class Clients(Server):
    def test_what_a_client_opened_goes_with_it_unless_shared(self):
        for arguments, left in (((), 0), (("--shared",), 1)):
            self.serve("test", *arguments)
            killed = subprocess.Popen(
                ["python3", "-c", "import sys, time; sys.path.insert(0, sys.argv[1]); import vexg_client;"
                 "c = vexg_client.Client('test'); print(c.submit(sys.argv[2])['o']['Result'], flush=True);"
                 "time.sleep(60)", str(SOURCE / "tests/host"),
                 command("o", "OpenRasterCommand", ConnStr=self.scene)], stdout=subprocess.PIPE, text=True)
            self.assertEqual(killed.stdout.readline(), "Success\n")
            listed = json.loads(run("open", "test", "--json")[1])
            self.assertEqual([(row["client"], row["opens"], row["kind"]) for row in listed],
                             [(killed.pid, 1, "raster")])
            self.assertIn(str(killed.pid), run("open", "test")[1])
            killed.kill()
            killed.communicate()
            self.until(lambda: self.pipes() == ["test"])
            listed = json.loads(run("open", "test", "--json")[1])
            self.assertEqual([row["client"] for row in listed], [0] * left)
            self.server.terminate()
            self.server.communicate(timeout=30)

    def test_a_job_ends_with_its_client_or_on_request(self):
        self.serve()
        client = start("submit", "--server", "test", "-")
        client.stdin.write(f"<Job>{WAIT}</Job>")
        client.stdin.close()
        self.until(self.jobs)
        (job,) = self.jobs()
        self.assertEqual((job["client"], job["commands"], job["aborted"]),
                         (client.pid, "ExampleWaitCommand", False))
        client.kill()
        self.until(lambda: not self.jobs(), 5)
        client.wait()
        client.stdout.close()
        client.stderr.close()
        left = f"vexg-submit.*-{client.pid}-*"  # of a client that could not remove it; any vexg does
        self.assertLessEqual(len(list(pathlib.Path("/dev/shm").glob(left))), 1)

        client = start("submit", "--server", "test", "--progress=json", "-")
        client.stdin.write(f"<Job>{WAIT}</Job>")
        client.stdin.close()
        self.until(self.jobs)
        self.assertEqual(list(pathlib.Path("/dev/shm").glob(left)), [])
        number = self.jobs()[0]["job"]
        self.assertEqual(run("abort", "test", str(number)), (0, "", ""))
        out, err = client.stdout.read(), client.stderr.read()
        self.assertEqual(client.wait(timeout=20), 1)
        lines = err.splitlines()
        self.assertEqual(json.loads(lines[-2])["ended"], "aborted")
        self.assertIn("the job was aborted", lines[-1])
        client.stdout.close()
        client.stderr.close()
        code, _, err = run("abort", "test", str(number))
        self.assertEqual((code, err), (1, f"vexg: no job {number} is running\n"))

    def test_an_aborted_verb_leaves_no_output(self):
        self.serve()
        big = write_orva(self.folder / "big.dat", 40000, 40000, 1)
        copy = start("copy", str(big), str(self.folder / "copy.dat"), "--server", "test")
        self.until(lambda: any("CopyRaster" in job["commands"] for job in self.jobs()))
        self.assertEqual(run("abort", "test", str(self.jobs()[0]["job"]))[0], 0)
        _, err = copy.communicate(timeout=30)
        self.assertEqual((copy.returncode, err), (1, "vexg: the job was aborted; nothing was written\n"))
        self.assertEqual(list(self.folder.glob("*copy.dat*")), [])

    def test_what_an_aborted_job_made_does_not_pass_for_whole(self):
        self.serve()
        big = write_orva(self.folder / "big.dat", 40000, 40000, 1)
        last = '<DependsOn Name="@ALL"/>'
        job = (f'<Job><Command Name="o" ID="OpenRasterCommand"><Input ConnStr="{big}"/><Output URI="$u"/></Command>'
               f'<Command Name="n" ID="CreateRasterCommand">{last}<Input SrcURI="$u" ConnStr="{self.folder}/new.tif"'
               ' Format="TIFF"/><Output URI="$n"/></Command>'
               f'<Command Name="c" ID="CopyRasterCommand">{last}<Input SrcURI="$u" DstURI="$n"/></Command>'
               f'<Command Name="x" ID="CloseRasterCommand">{last}<Input URI="$n"/></Command></Job>')
        for end in ("abort", "kill"):
            client = start("submit", "--server", "test", "-")
            client.stdin.write(job)
            client.stdin.close()
            self.until(lambda: any("CopyRaster" in entry["commands"] for entry in self.jobs()))
            if end == "kill":
                client.kill()
            else:
                run("abort", "test", str(self.jobs()[0]["job"]))
            client.wait(timeout=30)
            client.stdout.close()
            client.stderr.close()
            self.until(lambda: json.loads(run("open", "test", "--json")[1]) == [])
            self.until(lambda: list(self.folder.glob("new.tif*")) == [])

    def test_a_closed_output_aborts_the_job_and_leaves_nothing(self):
        self.serve()
        for verb in (["submit", "--server", "test", "-"], ["run", "-"]):
            process = start(*verb)
            process.stdin.write(f"<Job>{WAIT}</Job>")
            process.stdin.close()
            time.sleep(0.3)
            process.stdout.close()
            self.assertEqual(process.wait(timeout=10), -signal.SIGPIPE)
            self.assertEqual(process.stderr.read(), "")
            process.stderr.close()
            self.assertEqual(list(pathlib.Path("/dev/shm").glob(f"*{process.pid}*")), [])
        self.until(lambda: not self.jobs(), 5)


class Limits(Server):
    @unittest.skipIf(SANITIZED, "sanitizers take address space without end")
    def test_memory_that_is_short_ends_a_message_and_not_the_server(self):
        limit = 1 << 30
        self.serve(preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_AS, (limit, limit)))
        client = vexg_client.Client("test")
        for size in (100 << 20, 200 << 20):
            with vexg_client.connect(client.private) as pipe:
                try:
                    vexg_client.send(pipe, "<Job>" + " " * size + "</Job>")
                    vexg_client.receive(pipe)
                except ConnectionError:
                    pass
        self.alive()

    def test_silent_connections_do_not_use_up_the_server(self):
        self.serve(preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_NOFILE, (60, 60)))
        for count in (45, 10, 10, 10):
            for _ in range(count):
                self.addCleanup(vexg_client.connect("test").close)
            time.sleep(1.2)
            self.alive()


if __name__ == "__main__":
    unittest.main()
