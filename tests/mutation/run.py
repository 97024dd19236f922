#!/usr/bin/python3
"""Breaks the daemon and its tools on purpose, one behaviour at a time, and shows that their tests
notice.

mutants.toml lists the mutants; each replaces one piece of one source file and names the promise
that the program then no longer keeps. All work is done in a copy of the tracked files, as they are
in the working tree, in a temporary folder. The copy is built once and has to pass its tests. Then,
for each mutant: change the file, build, run the tests of its module, then all tests of the program,
those of the daemon's units before those of the whole, until one fails, and put the file back. With
--full, survivors are tried again with the tests of ./test.sh --full.

The exit status is 0 when every mutant was caught, 1 when one survived the tests of each commit, and
2 when the list, or the unbroken program itself, is at fault: a mutant that does not build, say, is
not caught.
"""

import argparse
import collections
import datetime
import os
import pathlib
import random
import re
import resource
import shutil
import signal
import subprocess
import sys
import tempfile
import threading
import time
import tomllib

ROOT = pathlib.Path(__file__).resolve().parents[2]
LIST = pathlib.Path(__file__).with_name("mutants.toml")

JOBS = "2"
BUILD = ["cmake", "--build", "--preset", "debug", "--parallel", JOBS]
# Without debug information: nobody debugs a mutant, and linking is most of the work.
CONFIGURE = ["cmake", "--preset", "debug", "-DBUILD_TESTING=ON", "-DCMAKE_CXX_FLAGS_DEBUG=-O0"]
FULL = "-DTOLKWD_FULL_TESTS="

# Each kind of tests, and how long all of them may take together. A mutant that hangs is caught by
# this bound; one that never stops growing is caught by the other.
TEST_SECONDS = {"unit": 60, "system": 1800, "check": 300, "report": 600, "page": 600}
TEST_MEMORY_BYTES = 4 << 30

# Which tests are for the files of a folder, the quick ones first. Of two folders that hold a file
# the first one counts.
KINDS = {"src": ("unit", "system"), "tools/tolkwd-report/page": ("page",),
         "tools/tolkwd-report": ("report",), "tools": ("check",)}

# How ctest is asked for the tests of a kind, where its label is not enough: a browser is started
# for what only it can tell.
IN_A_BROWSER = r"^report\.page(\.install|\.check\..*)?$"
SELECTIONS = {"report": ["-L", "^report$", "-E", IN_A_BROWSER], "page": ["-R", IN_A_BROWSER, "-V"]}

# Of these one test is a whole machine or a browser, and a busy machine can fail it, too.
UNSTEADY = ("system", "page")

# Modules whose tests have another's name.
TESTED_WITH = {"generations": "tracker", "servicestate": "tracker"}

# As ctest says it, or within the tests in a browser their runner, in either of its forms.
FAILED_TEST = re.compile(r"Test +#\d+: (?P<test>\S+) .*\*\*\*|"
                         r"^\d+: +(?:not ok \d+ - |\u2716 )(?P<part>.*)")
TIME_OUT = "time-out"

KEYS = {"name", "breaks", "file", "before", "after"}


class Fault(Exception):
    """The list of mutants does not fit the sources, or the unbroken program is broken."""


def load_mutants():
    """Returns the mutants of the list, each checked against the sources."""
    mutants = tomllib.loads(LIST.read_text())["mutant"]
    names = set()
    for mutant in mutants:
        name = mutant.get("name", "(no name)")
        if set(mutant) != KEYS:
            raise Fault(f"{name}: needs exactly {', '.join(sorted(KEYS))}")
        if name in names:
            raise Fault(f"{name}: there are two")
        names.add(name)
        check_place(mutant)
    return mutants


def check_place(mutant):
    """Makes sure that the text to replace is there exactly once, and is really replaced."""
    source = (ROOT / mutant["file"]).read_text()
    count = source.count(mutant["before"])
    if count != 1:
        raise Fault(f"{mutant['name']}: `before` is in {mutant['file']} {count} times")
    if mutant["before"] == mutant["after"]:
        raise Fault(f"{mutant['name']}: changes nothing")


def select(mutants, names, folder):
    """Returns the mutants of these names, or all where there are none, in the folder."""
    unknown = set(names) - {mutant["name"] for mutant in mutants}
    if unknown:
        raise Fault(f"no such mutant: {', '.join(sorted(unknown))}")
    selected = [mutant for mutant in mutants if isin(mutant["file"], folder) and
                (not names or mutant["name"] in names)]
    if not selected:
        raise Fault(f"no mutant is in {folder}")
    return selected


def isin(name, folder):
    """Whether the file is in the folder, at any depth; all files are in the empty one."""
    return not folder or name.startswith(folder.rstrip("/") + "/")


def sample(mutants, count, seed):
    """Returns so many mutants, drawn at random, spread evenly over the files."""
    rounds = collections.Counter()
    drawn = []
    for mutant in random.Random(seed).sample(mutants, len(mutants)):
        drawn.append((rounds[mutant["file"]], mutant))
        rounds[mutant["file"]] += 1
    drawn.sort(key=lambda each: each[0])
    chosen = [mutant for _, mutant in drawn[:count]]
    return [mutant for mutant in mutants if mutant in chosen]


def git(*arguments):
    """Returns what a git command prints about the project."""
    return subprocess.run(["git", "-C", ROOT, *arguments], check=True, capture_output=True,
                          text=True).stdout


def copy_project(folder):
    """Copies the tracked files, with what they hold now."""
    for name in git("ls-files", "-z").split("\0"):
        source = ROOT / name
        if name and source.exists():
            (folder / name).parent.mkdir(parents=True, exist_ok=True)
            shutil.copy2(source, folder / name)


def limit_memory():
    """Bounds the memory of the process to come and of its children."""
    resource.setrlimit(resource.RLIMIT_AS, (TEST_MEMORY_BYTES, TEST_MEMORY_BYTES))


def targets_of(kind):
    """Returns what has to be built for a kind of tests."""
    if kind == "report":
        return [f"report_{name}_test" for name in test_names(kind)] + [
            "tolkwd-report", "tolkwd", "stepclock"]
    return ["report_makepage"] if kind == "page" else ["all"]


def build(folder, targets):
    """Builds these targets of the copy; raises where they do not build."""
    result = subprocess.run([*BUILD, "--target", *targets], cwd=folder, check=False,
                            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)
    if result.returncode != 0:
        raise Fault(f"does not build:\n{result.stdout}")


def run_tests(folder, kind, pattern=None):
    """Runs the tests of one kind until one fails; returns that one, a time-out, or None."""
    command = ["ctest", "--test-dir", folder / "build/debug", *SELECTIONS.get(kind, ["-L", kind]),
               *(["-R", pattern] if pattern else []),
               "--parallel", JOBS, "--stop-on-failure", "--no-tests=error"]
    scratch = folder / "scratch"  # for what a test that is killed leaves behind
    scratch.mkdir(exist_ok=True)
    output = []
    with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True,
                          env=os.environ | {"TMPDIR": str(scratch)}, start_new_session=True,
                          preexec_fn=None if kind == "page" else limit_memory) as ctest:
        # All that it started is in the session that it leads.
        bound = threading.Timer(TEST_SECONDS[kind], os.killpg, [ctest.pid, signal.SIGKILL])
        bound.start()
        try:
            for line in ctest.stdout:
                output.append(line)
                if failed := FAILED_TEST.search(line):
                    # Other tests may run on, or hang.
                    return failed["test"] or f"in a browser: {failed['part']}"
            ctest.wait()
        finally:
            bound.cancel()
            if ctest.poll() is None:
                os.killpg(ctest.pid, signal.SIGKILL)
    if ctest.returncode == -signal.SIGKILL:
        return TIME_OUT
    if ctest.returncode != 0:
        raise Fault(f"no test failed, but ctest did:\n{''.join(output)}")
    return None


def kinds_for(mutant):
    """Returns the kinds of tests that may catch the mutant."""
    return next(kinds for folder, kinds in KINDS.items() if isin(mutant["file"], folder))


def all_kinds(mutants):
    """Returns the kinds of tests for these mutants, each once, in the order of their first use."""
    return dict.fromkeys(kind for mutant in mutants for kind in kinds_for(mutant))


def test_names(kind):
    """Returns the sets of tests of a kind that are programs of their own."""
    return [path.name.removesuffix("_test.cpp")
            for path in sorted((ROOT / "tests" / kind).glob("*_test.cpp"))]


def own_tests(kind, module):
    """Returns the target and the name's beginning of each set of tests made for the module: those
    of probe are also for probetext, and those of values for namevalues."""
    if kind == "page":
        return []
    prefix = {"unit": "", "check": "check_", "report": "report_"}[kind]
    module = TESTED_WITH.get(module, module)
    names = test_names(kind)
    if kind == "unit":
        names = [name for name in names if name == module]
    else:
        names = [name for name in names if module.startswith(name) or module.endswith(name)]
    return [(f"{prefix}{name}_test", f"{prefix.replace('_', '.')}{name}.") for name in names]


def catch(folder, kinds, module):
    """Builds and tests the copy, the quick tests first; returns what run_tests does."""
    for target, prefix in own_tests(kinds[0], module):
        build(folder, [target])
        if caught := run_tests(folder, kinds[0], f"^{re.escape(prefix)}"):
            return caught
    build(folder, all_targets(kinds))
    for kind in kinds:
        if not (caught := run_tests(folder, kind)):
            continue
        if kind in UNSTEADY:
            # Whoever catches it has to catch it again.
            caught = run_tests(folder, kind)
            if caught == TIME_OUT:
                raise Fault(f"the {kind} tests take too long to tell")
        return caught
    return None


def all_targets(kinds):
    """Returns what has to be built for these kinds of tests, each once."""
    targets = dict.fromkeys(target for kind in kinds for target in targets_of(kind))
    return ["all"] if "all" in targets else list(targets)


def prepare(folder, kinds):
    """Copies the project, whose unbroken programs have to pass their tests."""
    copy_project(folder)
    check_unbroken(folder, kinds, full=False)


def check_unbroken(folder, kinds, full):
    """Builds the unbroken programs, which have to pass their tests."""
    configure(folder, full)
    build(folder, all_targets(kinds))
    for kind in kinds:
        if failed := run_tests(folder, kind):
            raise Fault(f"the unbroken program fails: {failed}")


def try_mutant(folder, mutant):
    """Returns who caught the mutant, or None."""
    path = folder / mutant["file"]
    unbroken = path.read_text()
    path.write_text(unbroken.replace(mutant["before"], mutant["after"]))
    try:
        return catch(folder, kinds_for(mutant), path.stem)
    finally:
        path.write_text(unbroken)  # with a new time, so that it is built again


def configure(folder, full):
    """Chooses the tests of each commit, or those of ./test.sh --full."""
    subprocess.run([*CONFIGURE, FULL + ("ON" if full else "OFF")], cwd=folder, check=True,
                   stdout=subprocess.DEVNULL)


def try_again(folder, survivors):
    """Prints which of these mutants the tests of ./test.sh --full catch."""
    if survivors:
        check_unbroken(folder, all_kinds(survivors), full=True)
    for mutant in survivors:
        try:
            caught = try_mutant(folder, mutant)
            print(f"{mutant['name']}, by all tests: {caught or 'SURVIVED'}", flush=True)
        except Fault as fault:
            print(f"{mutant['name']}, by all tests: {fault}", flush=True)


def try_mutants(mutants, full):
    """Returns (mutant, who caught it or None) for each that builds, and how many do not."""
    results = []
    faults = 0
    with tempfile.TemporaryDirectory(prefix="tolkwd-mutation-",
                                     ignore_cleanup_errors=True) as name:
        folder = pathlib.Path(name)
        folder.chmod(0o755)  # tests look at whether other users reach their folders
        prepare(folder, all_kinds(mutants))
        for mutant in mutants:
            try:
                caught = try_mutant(folder, mutant)
                results.append((mutant, caught))
                print(f"{mutant['name']}: {caught or 'SURVIVED'}", flush=True)
            except Fault as fault:
                faults += 1
                print(f"{mutant['name']}: {fault}", flush=True)
        if full:
            try_again(folder, [mutant for mutant, caught in results if not caught])
    return results, faults


def write_table(path, results):
    """Writes who caught what as a Markdown table."""
    state = git("rev-parse", "--short", "HEAD").strip()
    if git("status", "--porcelain"):
        state += " with local changes"
    lines = [f"{datetime.date.today().isoformat()}, {state}", "",
             "| mutant | the promise it breaks | caught by |", "|---|---|---|"]
    for mutant, caught in results:
        lines.append(f"| {mutant['name']} | {mutant['breaks']} | {caught or '**survived**'} |")
    pathlib.Path(path).write_text("\n".join(lines) + "\n")


def parse_arguments():
    """Returns the command line's options."""
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--only", nargs="+", default=[], metavar="NAME",
                        help="try these mutants only")
    parser.add_argument("--in", dest="folder", metavar="FOLDER", default="",
                        help="try the mutants of this folder only: tools/tolkwd-report, say")
    parser.add_argument("--sample", type=int, metavar="N",
                        help="try N mutants only, drawn over all files")
    parser.add_argument("--seed", type=int, default=1, help="what --sample draws with (1)")
    parser.add_argument("--full", action="store_true",
                        help="try what survives again, with the tests of ./test.sh --full")
    parser.add_argument("--table", metavar="FILE",
                        help="write a Markdown table of the results to FILE")
    parser.add_argument("--list", action="store_true",
                        help="show the mutants and what they break, and try none")
    return parser.parse_args()


def main():
    """Tries the mutants and returns the exit status."""
    options = parse_arguments()
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(2))  # and tidy up
    start = time.monotonic()
    try:
        mutants = select(load_mutants(), options.only, options.folder)
        if options.sample:
            mutants = sample(mutants, options.sample, options.seed)
            print(f"{len(mutants)} mutants of {len({each['file'] for each in mutants})} files, "
                  f"drawn with the seed {options.seed}", flush=True)
        if options.list:
            for mutant in mutants:
                print(f"{mutant['name']}: {mutant['breaks']}")
            return 0
        results, faults = try_mutants(mutants, options.full)
    except Fault as fault:
        print(fault, file=sys.stderr)
        return 2
    survivors = [mutant["name"] for mutant, caught in results if not caught]
    print(f"{len(results) - len(survivors)} of {len(mutants)} caught in "
          f"{time.monotonic() - start:.0f} s")
    if survivors:
        print("survived:", *survivors)
    if options.table:
        write_table(options.table, results)
    if faults:
        return 2
    return 1 if survivors else 0


if __name__ == "__main__":
    sys.exit(main())
