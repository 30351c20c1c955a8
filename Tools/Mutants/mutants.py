#!/usr/bin/python3
"""Seeds faults into a folder's sources and tells which of them no test notices.

All faults are compiled in at once, see seed.py. First every test runs alone, without a fault, to learn which faults it reaches and
how long it takes. Then each fault is made alive in turn, and the tests that reach it run until one fails: those first that have
caught most in the same file, then the quick ones. What has been found is kept in the build folder, so a run that was stopped goes
on where it was.

At the end stands a table by file, then every fault that survived, with its place. Faults that change no behaviour stand with the
reason in the folder's .toml file beside this script and do not count. The exit status says whether the score is reached.
"""

import argparse
import collections
import concurrent.futures
import contextlib
import dataclasses
import json
import os
import pathlib
import re
import signal
import subprocess
import sys
import tempfile
import time
import tomllib

import seed

ROOT = pathlib.Path(__file__).resolve().parents[2]
BUILD = ROOT / "build" / "mutants"
WANTED_SCORE = 98.0

# How many of a fault's tests run before the others: most faults are caught by one of the first.
FIRST_TESTS = (12, 60)


@dataclasses.dataclass
class Test:
    program: pathlib.Path
    name: str
    seconds: float = 0.0
    reached: frozenset = frozenset()

    def key(self):
        return f"{self.program.name}:{self.name}"


def say(text):
    print(text, flush=True)


@contextlib.contextmanager
def workers(jobs):
    """Threads that drop what they have not begun when this script is stopped."""
    with concurrent.futures.ThreadPoolExecutor(jobs) as pool:
        try:
            yield pool
        except BaseException:
            pool.shutdown(wait=False, cancel_futures=True)
            raise


def run(command, folder, environment, seconds=None):
    """Runs a command to its end, or all of it to death when it takes longer or this script is stopped.

    Answers its status, none when it took too long, and its output.
    """
    with tempfile.TemporaryFile() as output:
        process = subprocess.Popen(command, cwd=folder, stdin=subprocess.DEVNULL, stdout=output, stderr=subprocess.STDOUT,
                                   start_new_session=True, env={**os.environ, **environment})
        try:
            status = process.wait(seconds)
        except subprocess.TimeoutExpired:
            status = None
        finally:
            if process.poll() is None:
                os.killpg(process.pid, signal.SIGKILL)
                process.wait()
        output.seek(0)
        return status, output.read()


def run_quietly(command, name):
    """Runs a step of the build; shows its output when it fails."""
    status, output = run(command, ROOT, {})
    if status != 0:
        sys.stdout.buffer.write(output)
        sys.exit(f"{name} failed.")


def build(programs):
    run_quietly(["cmake", "--preset", "mutants"], "Configuring")
    run_quietly(["cmake", "--build", "--preset", "mutants", "--target", *programs], "Building")
    found = []
    for program in programs:
        places = [each for each in BUILD.rglob(program) if each.is_file() and os.access(each, os.X_OK)]
        if len(places) != 1:
            sys.exit(f"The test program {program} was not built in one place: {places}")
        found.append(places[0])
    return found


def run_tests(program, names, seconds, environment):
    """Runs tests of a program. Answers the first that failed, "" when none did, or "too long"."""
    command = [program, "--gtest_fail_fast", "--gtest_brief=1", "--gtest_color=no", "--gtest_filter=" + ":".join(names)]
    status, output = run(command, program.parent, environment, seconds)
    if status is None:
        return "too long"
    if status == 0:
        return ""
    failed = re.search(rb"\[  FAILED  \] ([^\s,]+)", output)
    return failed[1].decode() if failed else f"ended with {status}"


def tests_of(program):
    listed = subprocess.run([program, "--gtest_list_tests"], capture_output=True, text=True, check=True).stdout
    suite = ""
    for line in listed.splitlines():
        if line.startswith("Running main"):
            continue
        name = line.split("#")[0].rstrip()
        if not name.startswith(" "):
            suite = name
        else:
            yield Test(program, suite + name.strip())


def learn(test, faults):
    """Runs a test without a fault; sets how long it took and what it reached."""
    with tempfile.NamedTemporaryFile() as reached:
        reached.write(bytes(faults))
        reached.flush()
        started = time.monotonic()
        failed = run_tests(test.program, [test.name], 300, {"MUTANTS_REACHED": reached.name})
        test.seconds = time.monotonic() - started
        content = pathlib.Path(reached.name).read_bytes()
    if failed:
        sys.exit(f"{test.key()} fails without any fault: {failed}")
    test.reached = frozenset(number for number, byte in enumerate(content) if byte)


def learn_all(programs, faults, mark, jobs):
    """Every test with what it reaches, from the last run if nothing has changed since."""
    tests = [test for program in programs for test in tests_of(program)]
    kept = BUILD / "reached.json"
    if kept.exists():
        known = json.loads(kept.read_text())
        if known["mark"] == mark:
            for test in tests:
                seconds, reached = known["tests"][test.key()]
                test.seconds, test.reached = seconds, frozenset(reached)
            return tests
    with workers(jobs) as pool:
        list(pool.map(lambda test: learn(test, len(faults)), tests))
    kept.write_text(json.dumps({"mark": mark,
                                "tests": {test.key(): [test.seconds, sorted(test.reached)] for test in tests}}))
    return tests


class Hunt:
    """Tries the faults one by one and keeps what came of each."""

    def __init__(self, tests):
        self._tests = tests
        self._catches = collections.defaultdict(collections.Counter)

    def outcome(self, fault):
        """The test that caught it, "survived" or "not reached"."""
        tests = [test for test in self._tests if fault.number in test.reached]
        if not tests:
            return "not reached"
        catches = self._catches[fault.file]
        tests.sort(key=lambda test: (-catches[test.key()], test.seconds))
        done = 0
        for end in (*FIRST_TESTS, len(tests)):
            by_program = collections.defaultdict(list)
            for test in tests[done:end]:
                by_program[test.program].append(test)
            done = end
            for program, chosen in by_program.items():
                limit = 10 + 10 * sum(test.seconds for test in chosen)
                failed = run_tests(program, [test.name for test in chosen], limit, {"MUTANT": str(fault.number)})
                if failed:
                    catches[f"{program.name}:{failed}"] += 1
                    return failed
        return "survived"


def identities(faults):
    """A name for each fault that stays the same while the code around it changes."""
    seen = collections.Counter()
    for fault in faults:
        place = "|".join(fault.place())
        seen[place] += 1
        yield f"{place}|{seen[place]}"


def try_faults(hunt, faults, outcomes, keep, jobs):
    """Finds the outcome of each fault that has none yet."""
    names = list(identities(faults))
    left = [(name, fault) for name, fault in zip(names, faults) if name not in outcomes]
    started = time.monotonic()
    with workers(jobs) as pool, keep.open("a", encoding="utf-8") as kept:
        futures = {pool.submit(hunt.outcome, fault): name for name, fault in left}
        for count, future in enumerate(concurrent.futures.as_completed(futures), start=1):
            outcomes[futures[future]] = future.result()
            kept.write(json.dumps([futures[future], future.result()]) + "\n")
            kept.flush()
            if count % 50 == 0 or count == len(left):
                say(f"  {count} of {len(left)} after {time.monotonic() - started:.0f} s")
    return {fault: outcomes[name] for name, fault in zip(names, faults)}


def earlier_outcomes(kept, mark, only_survivors):
    """What the last run found: all of it if nothing has changed since, and otherwise what was caught, if that is wanted."""
    outcomes = {}
    if kept.exists():
        first, *lines = kept.read_text(encoding="utf-8").splitlines() or ['""']
        outcomes = dict(json.loads(line) for line in lines)
        if only_survivors:
            outcomes = {name: outcome for name, outcome in outcomes.items() if outcome not in ("survived", "not reached")}
        elif json.loads(first) != mark:
            outcomes = {}
    with kept.open("w", encoding="utf-8") as again:
        again.write(json.dumps(mark) + "\n")
        for name, outcome in outcomes.items():
            again.write(json.dumps([name, outcome]) + "\n")
    return outcomes


def report(found, equivalents):
    """Prints the table and the survivors; answers the score."""
    reasons = {(each["file"], each["function"], each["change"], each["text"]): each["reason"] for each in equivalents}
    rows = collections.defaultdict(collections.Counter)
    survivors, used = [], set()
    for fault, outcome in found.items():
        row = rows[fault.file]
        row["faults"] += 1
        if outcome not in ("survived", "not reached"):
            row["caught"] += 1
        elif fault.place() in reasons:
            row["equivalent"] += 1
            used.add(fault.place())
        else:
            row[outcome] += 1
            survivors.append((fault, outcome))
    columns = ("faults", "not reached", "caught", "survived", "equivalent")
    say(f"\n{'file':<70}" + "".join(f"{column:>13}" for column in columns))
    for file, row in sorted(rows.items()):
        say(f"{file:<70}" + "".join(f"{row[column]:>13}" for column in columns))
    total = sum(rows.values(), collections.Counter())
    say(f"{'all':<70}" + "".join(f"{total[column]:>13}" for column in columns))
    if survivors:
        say("\nNot caught:")
    for fault, outcome in survivors:
        say(f"{fault.file}:{fault.line}: {fault.function}: {fault.change}: {fault.text}" +
            (" (no test reaches it)" if outcome == "not reached" else ""))
    for place in reasons.keys() - used:
        if any(fault.file == place[0] for fault in found):
            say("Listed as equivalent, but caught or not there any more: " + ": ".join(place))
    counting = total["faults"] - total["equivalent"]
    return 100 * total["caught"] / counting if counting else 100.0


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("folders", nargs="*", default=["facebook"], metavar="FOLDER",
                        help="names of the .toml files beside this script (default: facebook)")
    parser.add_argument("--file", default="", help="only the faults of files whose name holds this")
    parser.add_argument("--survivors", action="store_true",
                        help="only those that were not caught last time: after tests were added or the list was changed")
    parser.add_argument("-j", "--jobs", type=int, default=os.cpu_count(), help="how many tests run at once")
    options = parser.parse_args()

    signal.signal(signal.SIGTERM, lambda *_: sys.exit("Stopped; the next run goes on from here."))
    settings = [tomllib.loads((pathlib.Path(__file__).parent / f"{name}.toml").read_text(encoding="utf-8"))
                for name in options.folders]
    say("Seeding faults")
    names = [name for each in settings for name in seed.sources(ROOT, each["folder"])]
    faults = seed.seed(ROOT, names, BUILD / "sources")
    say(f"Building with {len(faults)} faults in {len(names)} files")
    programs = build([program for each in settings for program in each["programs"]])
    mark = seed.fingerprint(*(program.read_bytes() for program in programs))
    say("Learning which test reaches which fault")
    tests = learn_all(programs, faults, mark, options.jobs)
    say(f"Trying the faults with {len(tests)} tests")
    kept = BUILD / "outcomes.jsonl"
    outcomes = earlier_outcomes(kept, mark, options.survivors)
    chosen = [fault for fault in faults if options.file in fault.file]
    found = try_faults(Hunt(tests), chosen, outcomes, kept, options.jobs)
    score = report(found, [entry for each in settings for entry in each.get("equivalent", [])])
    say(f"\nScore: {score:.1f} % of the faults that change behaviour are caught; {WANTED_SCORE:.0f} % are wanted.")
    sys.exit(0 if score >= WANTED_SCORE else 1)


if __name__ == "__main__":
    main()
