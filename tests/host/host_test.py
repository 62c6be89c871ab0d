"""The command line as its users type it."""

import json
import os
import pathlib
import pty
import re
import signal
import subprocess
import tempfile
import time
import unittest

from support import EXAMPLES, SOURCE, VEXG, PipeTest, run, start

SUM = (SOURCE / "examples/jobs/sum.xml").read_text()
WAIT = '<Job><Command Name="w" ID="ExampleWaitCommand"><Input Seconds="60"/></Command>'
LATE = '<Command Name="late" ID="ExampleSumCommand"><DependsOn Name="w"/></Command></Job>'


def read_all(terminal):
    """All that was shown on a terminal whose other end is closed: it comes in pieces."""
    shown = b""
    try:
        while piece := os.read(terminal, 1 << 16):
            shown += piece
    except OSError:  # the end, where Linux has no other sign of it
        pass
    return shown.decode()


class Run(unittest.TestCase):
    def test_gives_the_result_as_xml_or_json(self):
        code, out, err = run("run", "-", stdin=SUM)
        self.assertEqual((code, err), (0, ""))
        self.assertIn('<Return Count="2" Sum="45"/>', out)
        code, out, err = run("run", "--json", str(SOURCE / "examples/jobs/sum.xml"))
        self.assertEqual((code, err), (0, ""))
        first, second = json.loads(out)["commands"]
        self.assertEqual((first["name"], first["return"]), ("bands", {"Count": 3, "Sum": 60}))
        self.assertEqual((second["result"], second["usage"]), ("Success", 0))
        for command in (first, second):
            for name in ("wall", "cpu"):
                self.assertIsInstance(command[name], float)
                self.assertLess(command[name], 60)

    def test_the_exit_code_tells_how_it_went(self):
        unknown = '<Job><Command Name="a" ID="X"/><Command Name="b" ID="ExampleWaitCommand"><Input Seconds="0"/></Command></Job>'
        cases = [
            ("fails", '<Job><Command Name="a" ID="ExampleSumCommand"/></Job>', 1, 'Result="Failed"',
             'vexg: command "a" (ExampleSumCommand) failed: input Values is missing\n'),
            ("bad value", '<Job><Command ID="ExampleSumCommand"><Input Values="1:9 [1] "/></Command></Job>',
             1, 'Result="Failed"', "is no number array"),
            ("unknown", unknown, 1, 'Name="b"', 'vexg: command "a" was left out: the ID "X" is unknown'),
            ("empty job", "<Job/>", 2, "<JobResult/>", "vexg: the job holds no Command\n"),
            ("cut", '<Job><Command Name="a"', 2, "", "standard input: not well formed: line 1, column"),
            ("nothing", "", 2, "", "standard input: not well formed: the document is empty"),
            ("DOCTYPE", "<!DOCTYPE Job><Job/>", 2, "", "a DOCTYPE is not allowed"),
        ]
        for what, job, code, out, err in cases:
            with self.subTest(what):
                got = run("run", "-", stdin=job)
                self.assertEqual(got[0], code)
                self.assertIn(out, got[1])
                self.assertIn(err, got[2])
                self.assertEqual(got[2].count("\n"), 1)

    def test_bad_usage_is_one_line(self):
        for arguments in [[], ["run"], ["fly"], ["run", "no-such-file"], ["run", "--what", "-"],
                          ["run", "-", "-o", "/no/such/place"], ["--load", "/no/such.so", "commands"],
                          ["run", "--progress", "loud", "-"], ["help", "NoSuchCommand"],
                          ["commands", "--json", "--names"], ["run", "/"]]:
            with self.subTest(arguments):
                code, out, err = run(*arguments, stdin=SUM)
                self.assertEqual((code, out), (2, ""))
                self.assertRegex(err, r"\Avexg: [^\n]+\n\Z")

    def test_an_output_file_is_whole_or_not_there(self):
        with tempfile.TemporaryDirectory() as directory:
            file = pathlib.Path(directory) / "result.xml"
            file.write_text("before")
            self.assertEqual(run("run", "-", "-o", str(file), stdin="<cut")[0], 2)
            self.assertEqual(file.read_text(), "before")
            self.assertEqual(run("run", "-", "-o", str(file), stdin=SUM)[:2], (0, ""))
            self.assertIn("JobResult", file.read_text())
            self.assertEqual(os.listdir(directory), ["result.xml"])
        with open("/dev/full", "w") as full:
            process = start("run", str(SOURCE / "examples/jobs/sum.xml"), stdout=full)
            _, err = process.communicate(timeout=60)
            self.assertEqual((process.returncode, err), (1, "vexg: standard output can't be written\n"))

    def test_progress_shows_where_it_is_asked_for(self):
        job = '<Job><Command ID="ExampleWaitCommand"><Input Seconds="0.2"/></Command></Job>'
        _, _, err = run("run", "-", "--progress=json", stdin=job)
        steps = [json.loads(line)["progress"] for line in err.splitlines()]
        self.assertEqual(steps[-1], 1.0)
        self.assertEqual(steps, sorted(set(steps)))
        self.assertGreater(len(steps), 2)
        self.assertEqual(run("run", "-", stdin=job)[2], "")
        self.assertEqual(run("run", "-", "--progress=json", "--quiet", stdin=job)[2], "")
        terminal, inside = pty.openpty()
        process = start("run", "-", stderr=inside)
        process.communicate(job, timeout=60)
        os.close(inside)
        shown = read_all(terminal)
        self.assertRegex(shown, r"\r\[=+ *\] +\d+ %")
        self.assertTrue(shown.endswith("] 100 %\r\n"), shown)

    def test_an_interrupt_aborts_the_job_and_still_gives_its_result(self):
        for number in (signal.SIGINT, signal.SIGTERM):
            process = start("run", "-", "--progress=json")
            process.stdin.write(WAIT + LATE)
            process.stdin.close()
            process.stderr.readline()  # the job is running
            process.send_signal(number)
            out = process.stdout.read()
            self.assertEqual(process.wait(timeout=10), 1)
            self.assertIn('Name="late" Result="Aborted"', out)
            process.stdout.close()
            process.stderr.close()


class Commands(unittest.TestCase):
    def test_are_listed_in_every_form(self):
        names = run("commands", "--names")[1].split()
        self.assertIn("ExampleSumCommand", names)
        self.assertEqual([c["name"] for c in json.loads(run("commands", "--json")[1])], names)
        for form in ([], ["--markdown"]):
            listed = run("commands", *form)[1]
            for name in names:
                self.assertIn(name, listed)
        help_text = run("help", "ExampleWaitCommand")[1]
        self.assertIn("Seconds  required, number in s", help_text)
        self.assertEqual(run("help", "run")[1], run("run", "--help")[1])

    def test_verbs_are_described_for_programs_and_readers(self):
        verbs = {verb["name"]: verb for verb in json.loads(run("help", "--json")[1])["verbs"]}
        listed = run("--help")[1].split("Subcommands:")[1].split()
        self.assertLessEqual(set(verbs), set(listed))
        for name, verb in verbs.items():
            shown = run(name, "--help")[1]
            manual = run("help", "--man", name)[1].replace("\\", "")
            named = set(re.findall(r"^  (?:-\w,)?(--[\w-]+)", shown, re.M)) - {"--help"}
            options = [option for option in verb["options"] if option["names"][0].startswith("--")]
            self.assertEqual({option["names"][0] for option in options}, named)
            for option in verb["options"]:
                self.assertIn("fB" + ", ".join(option["names"]) + "fR", manual)
        tile = next(o for o in verbs["pyramid"]["options"] if o["names"] == ["--tile"])
        self.assertEqual((tile["type"], tile["least"], tile["most"], tile["default"]), ("whole number", 1, 2048, "128"))
        elevation = next(o for o in verbs["calibrate"]["options"] if o["names"] == ["--sun-elevation"])
        self.assertEqual((elevation["type"], elevation["unit"]), ("number", "degrees"))
        self.assertEqual(run("help", "--json", "--man")[0], 2)

    def test_bad_values_are_refused_in_one_line(self):
        for arguments, want in [
                (["pyramid", "build", "x", "--tile", "0"], "--tile: 0 is not in 1 to 2048"),
                (["pyramid", "build", "x", "--tile", "-1"], '"-1" is no whole number'),
                (["abort", "vexg", "99999999999"], "job: \"99999999999\" is too large"),
                (["hist", "x", "--lower", "low"], '--lower: "low" is no number'),
                (["calibrate", "radiance", "x", "y", "--gain", "1,,2"], '--gain: "" is no number'),
                (["calibrate", "radiance", "x", "y", "--distance", "1 km"], "the unit is astronomical units"),
                (["read", "x"], "--output is required"),
                (["stats", "a", "b"], "The following argument was not expected: b")]:
            code, out, err = run(*arguments)
            self.assertEqual((code, out), (2, ""), arguments)
            self.assertEqual(len(err.splitlines()), 1, err)
            self.assertIn(want, err)

    def test_complete_in_a_shell(self):
        script = subprocess.run([VEXG, "completion", "bash"], capture_output=True, text=True, check=True)
        words = 'COMP_WORDS=(vexg {}); COMP_CWORD={}; _vexg; echo "${{COMPREPLY[@]}}"'
        for typed, index, want in [("ru", 1, "run"), ("help ExampleS", 2, "ExampleSumCommand"),
                                   ("submit --serv", 2, "--server"), ("commands --mark", 2, "--markdown"),
                                   ("read --interleave bs", 3, "bsq"), ("read --interleave = bs", 4, "bsq"),
                                   ("pyramid de", 2, "delete")]:
            # The shell finds vexg by its name; the example commands are loaded for it here.
            function = f'vexg() {{ "{VEXG}" --load "{EXAMPLES}" "$@"; }}\n'
            shell = subprocess.run(["bash", "-c", function + script.stdout + words.format(typed, index)],
                                   capture_output=True, text=True)
            self.assertEqual(shell.stdout.strip(), want, shell.stderr)


class Serve(PipeTest):
    def test_a_submitted_job_runs_there(self):
        self.serve()
        code, out, err = run("submit", "--server", "test", "-", stdin=SUM)
        self.assertEqual((code, err), (0, ""))
        self.assertIn('<Return Count="2" Sum="45"/>', out)
        # The command is unknown to the server, whatever this process has loaded.
        code, out, err = run("submit", "--server", "test", "-", stdin='<Job><Command Name="a" ID="X"/></Job>')
        self.assertEqual(code, 1)
        self.assertIn('vexg: command "a" was left out: the ID "X" is unknown', err)
        code, _, err = run("submit", "--server", "test", "--progress=json", "-",
                           stdin='<Job><Command ID="ExampleWaitCommand"><Input Seconds="0.3"/></Command></Job>')
        self.assertEqual(json.loads(err.splitlines()[-1])["progress"], 1.0)
        self.assertGreater(len(err.splitlines()), 2)

    def test_no_server_is_said(self):
        self.assertEqual(run("submit", "--no-wait", "-", stdin=SUM)[0], 3)
        self.assertEqual(run("stop", "--no-wait")[0], 3)
        code, out, err = run("submit", "--no-wait", "-", stdin="<cut")
        self.assertEqual((code, out), (2, ""))  # found before anything is sent
        self.assertEqual(err.count("\n"), 1)

    def test_a_submit_waits_for_its_server(self):
        waiting = start("submit", "--server", "test", "-")
        waiting.stdin.write(SUM)
        waiting.stdin.close()
        time.sleep(0.2)
        self.serve()
        self.assertIn("JobResult", waiting.stdout.read())
        self.assertEqual(waiting.wait(timeout=10), 0)
        waiting.stdout.close()
        waiting.stderr.close()

    def test_ends_on_the_word_and_on_signals_and_leaves_nothing(self):
        for end in ("word", signal.SIGINT, signal.SIGTERM):
            server = self.serve()
            self.assertEqual(run("submit", "--server", "test", "-", stdin=SUM)[0], 0)
            if end == "word":
                self.assertEqual(run("stop", "test")[0], 0)
            else:
                server.send_signal(end)
            self.assertEqual(server.wait(timeout=10), 0)
            self.assertEqual(self.pipes(), [])
            server.communicate()

    def test_a_signal_aborts_what_runs_and_the_client_gets_its_result(self):
        server = self.serve()
        client = start("submit", "--server", "test", "--progress=json", "-")
        client.stdin.write(WAIT + LATE)
        client.stdin.close()
        while json.loads(client.stderr.readline())["progress"] == 0.0:
            pass
        server.send_signal(signal.SIGTERM)
        self.assertEqual(server.wait(timeout=10), 0)
        self.assertIn('Name="late" Result="Aborted"', client.stdout.read())
        self.assertEqual(client.wait(timeout=10), 1)
        client.stdout.close()
        client.stderr.close()

    def test_an_interrupted_submit_aborts_its_job(self):
        self.serve()
        client = start("submit", "--server", "test", "--progress=json", "-")
        client.stdin.write(WAIT + LATE)
        client.stdin.close()
        while json.loads(client.stderr.readline())["progress"] == 0.0:
            pass
        client.send_signal(signal.SIGINT)
        self.assertIn('Name="late" Result="Aborted"', client.stdout.read())
        self.assertEqual(client.wait(timeout=10), 1)
        client.stdout.close()
        client.stderr.close()

    def test_a_killed_client_leaves_no_thread_and_a_killed_server_no_waiting(self):
        server = self.serve()
        client = start("submit", "--server", "test", "--progress=json", "-")
        client.stdin.write('<Job><Command ID="ExampleWaitCommand"><Input Seconds="0.5"/></Command></Job>')
        client.stdin.close()
        client.stderr.readline()
        client.kill()
        client.wait()
        deadline = time.monotonic() + 20
        while self.pipes() != ["test"] and time.monotonic() < deadline:
            time.sleep(0.02)
        self.assertEqual(self.pipes(), ["test"])
        client.stdout.close()
        client.stderr.close()

        client = start("submit", "--server", "test", "--progress=json", "-")
        client.stdin.write(WAIT + LATE)
        client.stdin.close()
        while json.loads(client.stderr.readline())["progress"] == 0.0:
            pass
        server.kill()
        out, err = client.stdout.read(), client.stderr.read()
        self.assertEqual((client.wait(timeout=10), out), (3, ""))
        self.assertIn("went away before it answered", err)
        client.stdout.close()
        client.stderr.close()
        server.communicate()
        self.serve()  # takes over the name that the dead server left
        self.assertEqual(run("submit", "--server", "test", "-", stdin=SUM)[0], 0)

    def test_two_servers_do_not_share_a_name(self):
        self.serve()
        code, _, err = run("serve", "test")
        self.assertEqual(code, 1)
        self.assertIn('the server "test" runs already', err)
        for name in ("a/b", "..", "%d", ""):
            self.assertEqual(run("serve", name)[0], 1, name)


if __name__ == "__main__":
    unittest.main()
