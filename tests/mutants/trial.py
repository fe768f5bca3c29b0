"""One mutant: changed in a copy of the sources, built, and shown to the tests that see it."""

import os
import re
import shutil
import subprocess
import time

import running
from count_lines import FAILED
from results import KILLED, SURVIVED, UNBUILT

STAGES = (2, 10, 40)  # seconds of tests, the fastest first, after each of which a survivor goes on
# Seconds for a run of tests, and times what it takes elsewhere. Other work on the machine makes it
# wait, which costs no time of the processor.
LIMIT = 30, 5
PROCESSOR_LIMIT = 10, 2
ATTEMPTS = 3
BUILD_LIMIT = 900
_STARTED = re.compile(r"^\[ RUN      \] (\S+)$", re.M)


class Copy:
    """The sources and their build; `control` is the build of the unchanged ones. The file `marker`
    names a source that is changed."""

    def __init__(self, folder, preset="mutants", control=None):
        self.control = control
        self.folder = folder
        self.build_folder = os.path.join(folder, "build", preset)
        self._preset = preset
        self._marker = os.path.join(folder, "build", "mutated")

    def prepare(self, root):
        """The sources as they are in `root`; what was built of them stays."""
        os.makedirs(os.path.join(self.folder, "build"), exist_ok=True)
        for name in os.listdir(self.folder):
            path = os.path.join(self.folder, name)
            if os.path.isdir(path) and not os.path.islink(path):
                if name != "build":
                    shutil.rmtree(path)
            else:
                os.remove(path)
        subprocess.run([os.path.join(root, "scripts/copy-sources"), self.folder], check=True)
        if os.path.exists(self._marker):  # an interrupted run has left objects of that mutant
            with open(self._marker, encoding="utf-8") as file:
                os.utime(os.path.join(self.folder, file.read()))
            os.remove(self._marker)
        self.configure()

    def configure(self):
        launcher = ["-DCMAKE_CXX_COMPILER_LAUNCHER=ccache"] if shutil.which("ccache") else []
        outcome = self._run(["cmake", "--preset", self._preset, *launcher])
        if not outcome.well():
            raise RuntimeError(f"cannot configure {self.folder}:\n{outcome.output}")

    def must_build(self, targets):
        outcome = self.build(targets)
        if not outcome.well():
            raise RuntimeError(f"cannot build {self.folder}:\n{outcome.output}")

    def build(self, targets):
        jobs = str(os.cpu_count())
        words = ["cmake", "--build", self.build_folder, "--target", *targets, "--parallel", jobs]
        return self._run(words)

    def _run(self, words):
        paths = {"CCACHE_BASEDIR": self.folder}  # the copies share what ccache keeps
        return running.run(words, BUILD_LIMIT, self.folder, paths)

    def change(self, candidate):
        """Returns the source as it was."""
        path = os.path.join(self.folder, candidate.path)
        with open(path, "rb") as file:
            data = file.read()
        with open(self._marker, "w", encoding="utf-8") as file:
            file.write(candidate.path)
        self.write(candidate, candidate.applied_to(data))
        return data

    def write(self, candidate, data):
        with open(os.path.join(self.folder, candidate.path), "wb") as file:
            file.write(data)


def judge(copy, candidate, groups):
    """The verdict on a candidate that `groups` see, as a record of the results."""
    start = time.monotonic()
    before = copy.change(candidate)
    try:
        record = _judge_changed(copy, groups)
    finally:
        copy.write(candidate, before)
    return {**record, "tests": len(groups), "seconds": round(time.monotonic() - start, 1)}


def _judge_changed(copy, groups):
    if not groups and not copy.build(["tarnwick_static"]).well():
        return {"verdict": UNBUILT}
    doubts = []
    for stage in stages(groups):
        targets = [os.path.basename(program) for program, _ in stage]
        if not copy.build(targets).well():
            return {"verdict": UNBUILT}
        for program, of_program in stage:
            failure = failure_of(copy, program, of_program, doubts)
            if failure:
                return {"verdict": KILLED, **failure, "doubts": doubts}
    return {"verdict": SURVIVED, "doubts": doubts}


def stages(groups):
    """[[(program, its groups), ...], ...]: the fastest tests first."""
    result, passed, total = [], 0, 0.0
    stage = {}
    for group in sorted(groups, key=lambda g: g["seconds"]):
        if passed < len(STAGES) and total + group["seconds"] > STAGES[passed] and stage:
            result.append(stage)
            stage, passed = {}, passed + 1
        total += group["seconds"]
        stage.setdefault(group["program"], []).append(group)
    result += [stage] if stage else []
    return [sorted(stage.items(), key=lambda item: _seconds(item[1])) for stage in result]


def _seconds(groups):
    return sum(group["seconds"] for group in groups)


def failure_of(copy, program, groups, doubts):
    """The test that fails and how; None when all pass. A test that fails once proves nothing: it
    has to fail again, and to pass with the unchanged sources. Others are noted in `doubts`."""
    wanted = _filter(groups)
    seconds = _seconds(groups)
    for _ in range(ATTEMPTS):
        outcome = _run_tests(copy, program, wanted, seconds)
        if outcome.well():
            return None
        test = _culprit(outcome.output)
        failure = {"by": test or f"{program} does not start", "how": _manner(outcome)}
        if _fails_here_alone(copy, program, test or wanted, seconds):
            return failure
        doubts.append(test)
    return failure if _fails_here_alone(copy, program, wanted, seconds) else None


def _fails_here_alone(copy, program, wanted, seconds):
    if _run_tests(copy, program, wanted, seconds).well():
        return False
    return copy.control is None or _run_tests(copy.control, program, wanted, seconds).well()


def _filter(groups):
    without = [name for group in groups for name in group.get("without", [])]
    wanted = ":".join(group["filter"] for group in groups)
    return wanted + ("-" + ":".join(without) if without else "")


def _run_tests(copy, program, wanted, seconds):
    command = [os.path.join(copy.build_folder, program), "--gtest_filter=" + wanted]
    processor = PROCESSOR_LIMIT[0] + PROCESSOR_LIMIT[1] * seconds
    command = running.sandboxed(copy.folder, [*command, "--gtest_fail_fast"], processor)
    return running.run(command, LIMIT[0] + LIMIT[1] * seconds, copy.folder)


def _culprit(output):
    failed = FAILED.search(output)
    started = _STARTED.findall(output)
    return failed.group(1) if failed else started[-1] if started else None


def _manner(outcome):
    if not outcome.in_time():
        return "time"
    return "failed" if FAILED.search(outcome.output) else "crashed"
