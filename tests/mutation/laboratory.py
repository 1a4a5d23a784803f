"""A copy of the tree in which mutants are built and tested."""

import contextlib
import os
import pathlib
import re
import resource
import shutil
import signal
import subprocess
import tempfile
import time

LISTED_TEST = re.compile(r"^ +Test +#\d+: (\S+)", re.MULTILINE)
MEMORY = 16 << 30  # a mutant may allocate without end
FILE_SIZE = 2 << 30
# Checks of texts of the tree, and tests that take long for what they could detect here.
NOT_JUDGES = ("include_directions.*|every_test_is_built.*|folders.*|thread_words.*|run_paths.*|check_test|"
              "headers_stand_alone.*|compile_failure_self_test|kernel_.*|check_installed|projector_stress_test|mutation_.*|"
              "fuzz_.*")


def limit_resources():
    os.nice(19)
    resource.setrlimit(resource.RLIMIT_AS, (MEMORY, MEMORY))
    resource.setrlimit(resource.RLIMIT_FSIZE, (FILE_SIZE, FILE_SIZE))
    resource.setrlimit(resource.RLIMIT_CORE, (0, 0))


def namespace_command():
    """What confines processes to a namespace of their own, because a mutant may signal any process it sees."""
    for command in (["unshare", "--pid", "--fork", "--mount-proc", "--kill-child"],
                    ["unshare", "--map-root-user", "--pid", "--fork", "--mount-proc", "--kill-child"]):
        if subprocess.run([*command, "true"], capture_output=True, check=False).returncode == 0:
            return command
    return None


class Laboratory:
    """Builds and tests one text of the tree at a time."""

    def __init__(self, root, work, jobs, confine):
        self.root = root
        self.source = work / "source"
        self.build = self.source / "build" / "test"  # so that a compiler cache knows the paths
        # Tests become other users, who cannot enter a work folder below somebody's home.
        self.enclosing = tempfile.TemporaryDirectory(prefix="quazor-mutation-")
        os.chmod(self.enclosing.name, 0o711)
        self.scratch = pathlib.Path(self.enclosing.name) / "scratch"
        self.output = work / "output"
        self.jobs = jobs
        self.confine = confine

    def close(self):
        self.enclosing.cleanup()

    def enclosing_mode(self):
        return os.stat(self.enclosing.name).st_mode

    def update(self):
        """Makes the copy equal to the tree's files, without touching those that are equal."""
        listed = subprocess.run(["git", "ls-files", "-co", "--exclude-standard"], cwd=self.root, check=True,
                                capture_output=True, text=True).stdout.splitlines()
        wanted = {name for name in listed if (self.root / name).is_file()}
        for name in sorted(wanted):
            copy, original = self.source / name, self.root / name
            if not copy.is_file() or copy.read_bytes() != original.read_bytes():
                copy.parent.mkdir(parents=True, exist_ok=True)
                shutil.copy(original, copy)
        for path in list(self.source.rglob("*")):
            relative = path.relative_to(self.source)
            if relative.parts[0] != "build" and path.is_file() and relative.as_posix() not in wanted:
                path.unlink()

    def configure(self):
        cache = shutil.which("ccache")
        launcher = [f"-DCMAKE_CXX_COMPILER_LAUNCHER={cache}"] if cache else []
        self._run(["cmake", "-S", str(self.source), "-B", str(self.build), "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Debug",
                   "-DCMAKE_CXX_FLAGS_DEBUG=-g1", "-DQUAZOR_TESTS=ON", *launcher], 600)

    def known_tests(self):
        """The names of all tests, whether built or not."""
        listed = subprocess.run(["ctest", "--test-dir", str(self.build), "-N"], capture_output=True, text=True, check=True)
        return set(LISTED_TEST.findall(listed.stdout))

    def targets(self):
        listed = subprocess.run(["ninja", "-C", str(self.build), "-t", "targets", "all"], capture_output=True, text=True,
                                check=True)
        return {line.split(":", 1)[0] for line in listed.stdout.splitlines()}

    @contextlib.contextmanager
    def mutated(self, mutant):
        """The copy with the mutant applied, until the end of the block."""
        path = self.source / mutant.file
        original = path.read_text(encoding="utf-8")
        path.write_text(mutant.applied(original), encoding="utf-8")
        try:
            yield
        finally:
            path.write_text(original, encoding="utf-8")

    def make(self, targets, limit=1800):
        """Builds the targets, all without names. Returns whether it succeeded, and the output."""
        return self._run(["ninja", "-C", str(self.build), f"-j{self.jobs}", *targets], limit)

    def test(self, pattern, each, limit):
        """Runs the tests that match, up to the first failure. Returns whether all passed, and the output."""
        command = ["ctest", "--test-dir", str(self.build), f"-j{self.jobs}", "--output-on-failure", "--stop-on-failure",
                   "--no-tests=error", "--timeout", str(each), "-E", f"^({NOT_JUDGES})$"]
        shutil.rmtree(self.scratch, ignore_errors=True)
        self.scratch.mkdir(parents=True)
        return self._run([*self.confine, *command, *(["-R", pattern] if pattern else [])], limit)

    def _run(self, command, limit):
        place = str(self.scratch)
        environment = {**os.environ, "TMPDIR": place, "HOME": place, "XDG_STATE_HOME": place}
        if "CCACHE_DIR" not in environment and shutil.which("ccache"):
            environment["CCACHE_DIR"] = str(pathlib.Path.home() / ".cache" / "ccache")
        if not self.scratch.is_dir():
            self.scratch.mkdir(parents=True)
        with open(self.output, "wb") as log:
            process = subprocess.Popen(command, stdout=log, stderr=subprocess.STDOUT, stdin=subprocess.DEVNULL,
                                       env=environment, start_new_session=True, preexec_fn=limit_resources)
            try:
                code = process.wait(timeout=limit)
            except subprocess.TimeoutExpired:
                code = None
            finally:
                if process.poll() is None:
                    os.killpg(process.pid, signal.SIGKILL)
                    process.wait()
        return code == 0, self.output.read_text(encoding="utf-8", errors="replace")


def seconds_since(begin):
    return round(time.monotonic() - begin, 1)
