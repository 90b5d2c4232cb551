#!/usr/bin/python3
"""Runs `tavik status --watch` and `tavik events --follow` in a terminal emulator, beside a real sensor with the simulated
adapters' library, and looks at what a person would see: rows of a screen, after a resize too, and the terminal as it was
at the end.

    live_screens.py FOLDER LIBRARY     FOLDER holds the built programs
"""
import fcntl
import os
import pty
import select
import signal
import struct
import subprocess
import sys
import tempfile
import termios
import time

import pyte

PATIENCE = 40  # seconds for one thing to happen
OTHER_SCREEN, OWN_SCREEN, SHOWN_CURSOR = b"\x1b[?1049h", b"\x1b[?1049l", b"\x1b[?25h"


class Terminal:
    """A program in a terminal of its own."""

    def __init__(self, command, environment, columns=80, rows=24):
        self.screen = pyte.Screen(columns, rows)
        self.stream = pyte.ByteStream(self.screen)
        self.bytes = b""
        self.master, self.slave = pty.openpty()
        self.set_size(columns, rows)
        self.before = termios.tcgetattr(self.slave)
        self.child = subprocess.Popen(
            command, stdin=self.slave, stdout=self.slave, stderr=self.slave, env=environment,
            preexec_fn=self.take_terminal)

    def take_terminal(self):
        os.setsid()
        fcntl.ioctl(self.slave, termios.TIOCSCTTY, 0)

    def set_size(self, columns, rows):
        fcntl.ioctl(self.master, termios.TIOCSWINSZ, struct.pack("HHHH", rows, columns, 0, 0))

    def resize(self, columns, rows):
        self.screen.resize(rows, columns)
        self.set_size(columns, rows)

    def read(self, seconds):
        if select.select([self.master], [], [], seconds)[0]:
            data = os.read(self.master, 65536)
            self.bytes += data
            self.stream.feed(data)

    def rows(self):
        return [row.rstrip() for row in self.screen.display]

    def wait_until(self, what, holds):
        end = time.monotonic() + PATIENCE
        while not holds(self.rows()):
            if time.monotonic() > end:
                raise AssertionError(f"waited {PATIENCE} s for {what}; the screen:\n" + "\n".join(self.rows()))
            self.read(0.1)

    def press(self, keys):
        os.write(self.master, keys)

    def end(self):
        """Waits for the end of the program; returns its status."""
        end = time.monotonic() + PATIENCE
        while self.child.poll() is None:
            assert time.monotonic() < end, f"the program goes on {PATIENCE} s after it was told to end"
            self.read(0.1)
        self.read(0.1)
        assert termios.tcgetattr(self.slave) == self.before, "the terminal's settings are not as they were"
        return self.child.returncode

    def close(self):
        if self.child.poll() is None:
            self.child.kill()
            self.child.wait()
        os.close(self.master)
        os.close(self.slave)


def check_left_screen(terminal):
    assert terminal.bytes.count(OTHER_SCREEN) == 1, "the live screen is not drawn on the other screen"
    assert terminal.bytes.rstrip().endswith(OWN_SCREEN), "the terminal is left on the other screen"
    assert terminal.bytes.rfind(SHOWN_CURSOR) > terminal.bytes.rfind(b"\x1b[?25l"), "the cursor stays hidden"


def check_watch(tavik, environment, inject):
    terminal = Terminal([tavik, "status", "--watch"], environment)
    try:
        terminal.wait_until("the state", lambda rows: rows[0].startswith("  host: ") and " state: COLLECTING" in rows[1])
        terminal.wait_until("how to leave", lambda rows: rows[23] == "q: quit")
        inject("queue-full board=hba0 port=disk0 lun=3 times=17")
        terminal.wait_until("the new episode", lambda rows: any("queue-full" in row and " 17 " in row for row in rows))
        terminal.resize(60, 16)
        terminal.wait_until("the smaller screen", lambda rows: len(rows) == 16 and rows[15] == "q: quit" and
                            rows[0].startswith("  host: ") and len(rows[0]) <= 57)
        assert not any("q: quit" in row for row in terminal.rows()[:15]), "something of the old size is left"
        terminal.resize(100, 40)
        terminal.wait_until("the larger screen", lambda rows: len(rows) == 40 and rows[39] == "q: quit" and
                            len(rows[0]) > 60)
        terminal.press(b"q")
        assert terminal.end() in (0, 1), f"status {terminal.child.returncode} while it collects"
        check_left_screen(terminal)
    finally:
        terminal.close()
    for what, tell in (("Ctrl-C", lambda one: one.press(b"\x03")), ("SIGTERM", lambda one: one.child.terminate())):
        terminal = Terminal([tavik, "status", "--watch"], environment)
        try:
            terminal.wait_until("the state", lambda rows: " state: " in rows[1])
            tell(terminal)
            assert terminal.end() in (0, 1), f"status {terminal.child.returncode} after {what}"
            check_left_screen(terminal)
        finally:
            terminal.close()


def check_follow(tavik, environment, inject):
    terminal = Terminal([tavik, "events", "--follow", "--kind", "device-busy"], environment)
    try:
        inject("device-busy board=hba0 port=disk1 lun=5 times=9")
        terminal.wait_until("the heading", lambda rows: any(row.startswith("EPISODE") for row in rows))
        terminal.wait_until("the episode", lambda rows: any("device-busy" in row and " 9 " in row for row in rows))
        assert not any("queue-full" in row for row in terminal.rows()), "another kind is shown"
        assert OTHER_SCREEN not in terminal.bytes, "what is followed has to stay in the terminal's own screen"
        terminal.press(b"\x03")
        status = terminal.end()
        assert status in (0, -signal.SIGINT), f"status {status} after Ctrl-C"
    finally:
        terminal.close()


def main():
    folder, library = sys.argv[1:3]
    with tempfile.TemporaryDirectory() as directory:
        config = os.path.join(directory, "tavik.toml")
        with open(config, "w", encoding="utf-8") as file:
            file.write(f'[agent]\nlibrary = "{library}"\nlog = "{directory}/agent.log"\n'
                       f'[sensor]\ndirectory = "{directory}/run"\nstate = "{directory}/state"\n'
                       '[collect]\nperiod = 0.2\n[http]\nlisten = ""\n')
        for name in ("run", "state"):
            os.mkdir(os.path.join(directory, name))
        environment = dict(os.environ, TAVIK_CONFIG=config, KPM_SIM_SOCKET=os.path.join(directory, "sim.sock"),
                           KPM_SIM_SCENARIO=os.path.join(directory, "ports.kpm"), TERM="xterm", TZ="UTC")
        environment.pop("NO_COLOR", None)
        with open(environment["KPM_SIM_SCENARIO"], "w", encoding="utf-8") as file:
            file.write(SCENARIO)

        def inject(text):
            end = time.monotonic() + PATIENCE
            while True:
                done = subprocess.run([os.path.join(folder, "kpm-sim"), "inject", text], env=environment,
                                      capture_output=True, text=True, check=False)
                if done.returncode == 0:
                    return
                assert time.monotonic() < end, f"kpm-sim cannot inject: {done.stderr}"
                time.sleep(0.1)

        tavik = os.path.join(folder, "tavik")
        with open(os.path.join(directory, "sensor.log"), "w+", encoding="utf-8") as log:
            sensor = subprocess.Popen([os.path.join(folder, "tavik-sensor")], env=environment, stderr=log, stdout=log)
            try:
                check_watch(tavik, environment, inject)
                check_follow(tavik, environment, inject)
            except AssertionError:
                log.seek(0)
                print(log.read()[-4000:])
                raise
            finally:
                sensor.terminate()
                sensor.wait()


SCENARIO = """\
adapter hba0 wwpn=30:00:00:00:00:01:00:00 wwnn=30:00:00:00:00:01:00:80 fcid=0x010000
port disk0 wwpn=30:00:00:00:00:02:00:00 wwnn=30:00:00:00:00:02:00:80 fcid=0x010100
port disk1 wwpn=30:00:00:00:00:02:00:01 wwnn=30:00:00:00:00:02:00:81 fcid=0x010200
"""

if __name__ == "__main__":
    main()
