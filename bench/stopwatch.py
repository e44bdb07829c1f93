"""Runs a command and prints the seconds that it took, its processor seconds, its peak memory in bytes, its status.

A program's peak counts that of the process which started it, up to the moment in which it becomes that program.
So this is a process of its own, which loads next to nothing. usage: python3 -I -S stopwatch.py COMMAND...
"""

import os
import sys
import time

SILENCE = [(os.POSIX_SPAWN_OPEN, 0, os.devnull, os.O_RDONLY, 0), (os.POSIX_SPAWN_OPEN, 1, os.devnull, os.O_WRONLY, 0)]

command = sys.argv[1:]
started = time.perf_counter()
process = os.posix_spawn(command[0], command, os.environ, file_actions=SILENCE)
_, status, usage = os.wait4(process, 0)
seconds = time.perf_counter() - started
print(seconds, usage.ru_utime + usage.ru_stime, usage.ru_maxrss * 1024, os.waitstatus_to_exitcode(status))
