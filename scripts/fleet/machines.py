"""Machines to try a fleet on: ssh servers, and a cluster of Slurm, on 127.0.0.1 and with all that they need made anew.

Each machine is a PID namespace, so that its death ends all that runs on it, as if its power went.
"""

import os
import shutil
import socket
import subprocess
import sys
import time
from pathlib import Path

NODES = ("node1", "node2", "node3")
PRIVILEGE_SEPARATION = Path("/run/sshd")

SLURM = """\
ClusterName=fleet
SlurmctldHost={host}(127.0.0.1)
SlurmctldPort={port}
CommunicationParameters=NoCtldInAddrAny,NoInAddrAny
SlurmUser=root
SlurmdUser=root
AuthType=auth/munge
AuthInfo=socket={directory}/munge.socket,cred_expire=10
StateSaveLocation={directory}/state
SlurmdSpoolDir={directory}/spool-%n
SlurmctldPidFile={directory}/slurmctld.pid
SlurmdPidFile={directory}/%n.pid
ProctrackType=proctrack/linuxproc
TaskPlugin=task/none
MpiDefault=none
JobAcctGatherType=jobacct_gather/none
MailProg=/bin/true
SelectType=select/cons_tres
SelectTypeParameters=CR_CPU
SlurmdParameters=config_overrides
ReturnToService=2
SlurmdTimeout=5
SchedulerParameters=sched_interval=1
PartitionName=all Nodes=ALL Default=YES
"""
SLURM_NODE = "NodeName={name} NodeHostname={host} NodeAddr=127.0.0.1 Port={port} CPUs=2\n"

SSHD = """\
ListenAddress 127.0.0.1:{port}
HostKey {directory}/host
AuthorizedKeysFile {directory}/user.pub
PidFile none
StrictModes no
UsePAM no
PermitRootLogin prohibit-password
PasswordAuthentication no
MaxStartups 100
SetEnv HOME={directory}/{name} PATH={path}
"""
SSH_HOST = """\
Host {name}
  HostName 127.0.0.1
  Port {port}
  HostKeyAlias fleet
"""
SSH = """\
Host *
  User root
  IdentityFile {directory}/user
  UserKnownHostsFile {directory}/known
  BatchMode yes
  LogLevel ERROR
  ConnectTimeout 10
  ConnectionAttempts 15
  ServerAliveInterval 15
  ControlMaster auto
  ControlPath {directory}/%C
  ControlPersist 60
"""


def free_port():
    with socket.socket() as listener:
        listener.bind(("127.0.0.1", 0))
        return listener.getsockname()[1]


def output_of(*command, **options):
    """The standard output of a command, which must succeed."""
    return subprocess.run(command, check=True, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, text=True,
                          **options).stdout


def wait_until(what, condition, seconds=60):
    deadline = time.monotonic() + seconds
    while not condition():
        if time.monotonic() > deadline:
            sys.exit(f"check-fleet: waited in vain until {what}")
        time.sleep(0.2)


class Machines:
    """Machines of one kind. Whatever was started ends with this object, and with this process."""

    def __init__(self, directory):
        self.directory = directory
        self.directory.mkdir()
        self.running = {}
        self.ports = {name: free_port() for name in NODES}

    def __enter__(self):
        try:
            self.prepare()
            for name in NODES:
                self.start(name)
            self.wait_for(NODES)
        except BaseException:
            self.__exit__()
            raise
        return self

    def __exit__(self, *_):
        for name in list(self.running):
            self.kill(name)

    def daemon(self, name, *command):
        with (self.directory / f"{name}.out").open("ab") as output:
            self.running[name] = subprocess.Popen(["setpriv", "--pdeathsig", "KILL", *command], stdout=output,
                                                  stdin=subprocess.DEVNULL, stderr=output)

    def start(self, name):
        # With its first process, a PID namespace loses all others. The shell is there to wait for orphans.
        self.daemon(name, "unshare", "--pid", "--fork", "--mount-proc", "--kill-child=KILL",
                    "sh", "-c", '"$@" & wait', "sh", *self.server(name))

    def kill(self, name):
        process = self.running.pop(name)
        process.kill()
        process.wait()


class SSHMachines(Machines):
    def prepare(self):
        PRIVILEGE_SEPARATION.mkdir(exist_ok=True)
        for key in ("host", "user"):
            output_of("ssh-keygen", "-q", "-t", "ed25519", "-N", "", "-f", str(self.directory / key))
        known = " ".join((self.directory / "host.pub").read_text().split()[:2])
        (self.directory / "known").write_text(f"fleet {known}\n")
        config = "".join(SSH_HOST.format(name=name, port=port) for name, port in self.ports.items())
        (self.directory / "config").write_text(config + SSH.format(directory=self.directory))
        for name, port in self.ports.items():
            (self.directory / name).mkdir()
            (self.directory / f"{name}.conf").write_text(
                SSHD.format(directory=self.directory, name=name, port=port, path=os.environ["PATH"]))
        self.environment = {"PARALLEL_SSH": f"ssh -F {self.directory}/config"}

    def server(self, name):
        return shutil.which("sshd"), "-D", "-e", "-f", str(self.directory / f"{name}.conf")

    def answers(self, name):
        return subprocess.run(["ssh", "-F", self.directory / "config", name, "true"], stdin=subprocess.DEVNULL,
                              stderr=subprocess.DEVNULL, check=False).returncode == 0

    def wait_for(self, names):
        wait_until("the ssh servers answer", lambda: all(map(self.answers, names)))

    def is_missed(self, name):
        return True

    def leftovers(self):
        """What batches left on the machines. Only one that was killed keeps the directories of its last ones."""
        return {name: len(list((self.directory / name).glob(".parallel/tmp/*-*-*"))) for name in NODES}


class SlurmMachines(Machines):
    def prepare(self):
        private = self.directory / "munge"
        private.mkdir(mode=0o700)
        (private / "key").write_bytes(os.urandom(128))
        (private / "key").chmod(0o600)
        (self.directory / "state").mkdir()
        config, host = self.directory / "slurm.conf", socket.gethostname()
        nodes = "".join(SLURM_NODE.format(name=name, host=host, port=port) for name, port in self.ports.items())
        config.write_text(SLURM.format(directory=self.directory, host=host, port=free_port()) + nodes)
        self.environment = {"SLURM_CONF": str(config)}
        self.daemon("munged", "munged", "--foreground", f"--socket={self.directory}/munge.socket",
                    *(f"--{name}-file={private}/{name}" for name in ("key", "pid", "log", "seed")))
        wait_until("munged listens", (self.directory / "munge.socket").exists)
        self.daemon("slurmctld", "slurmctld", "-D", "-f", str(config))

    def server(self, name):
        return "slurmd", "-D", "-f", self.environment["SLURM_CONF"], "-N", name

    def state(self, name):
        shown = subprocess.run(["sinfo", "-h", "-n", name, "-o", "%T"], env={**os.environ, **self.environment},
                               stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True, check=False)
        return shown.stdout.strip()

    def wait_for(self, names):
        wait_until("the nodes are there", lambda: all(self.state(name) in ("idle", "mixed", "allocated")
                                                      for name in names))

    def is_missed(self, name):
        return self.state(name).startswith("down")

    def leftovers(self):
        return {}
