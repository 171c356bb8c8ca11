#!/usr/bin/env python3
"""plant-faults.py: plants one fault at a time in a copy of the tree and runs the tests on it.

Each row of scripts/planted-faults.txt names a file, a text that must occur in it exactly once,
its replacement, what a user would meet and the tests to run (a ctest regex). For every row the
copy gets that one change, is built incrementally (one build directory for all rows, with the
compiler cache), and the row's tests run; the fault is caught when one of them fails. A row whose
text is not found exactly once, or whose change does not compile, is reported as not planted.
Not part of the default test run: each fault is a rebuild and a test run.

    scripts/plant-faults.py                   # every row, its own tests
    scripts/plant-faults.py F03 T07           # some rows
    scripts/plant-faults.py --full            # every row against the whole suite
    scripts/plant-faults.py --report out.md   # the Markdown table also into a file
"""
import argparse
import os
import re
import subprocess
import sys
import time

HERE = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))
TABLE = os.path.join(HERE, "scripts", "planted-faults.txt")
FIELDS = ("id", "file", "find", "replace", "user", "tests")


def unescape(text):
    return text.replace("\\n", "\n").replace("\\t", "\t")


def read_table(path):
    """Rows are tab-separated: id, file, find, replace, user, tests; \\n stands for a newline."""
    rows = []
    with open(path, encoding="utf-8") as table:
        for number, line in enumerate(table, 1):
            line = line.rstrip("\n")
            if not line.strip() or line.startswith("#"):
                continue
            cells = line.split("\t")
            if len(cells) != len(FIELDS):
                sys.exit(f"{path}:{number}: {len(cells)} cells, {len(FIELDS)} expected")
            row = dict(zip(FIELDS, cells))
            row["find"], row["replace"] = unescape(row["find"]), unescape(row["replace"])
            rows.append(row)
    return rows


def run(command, cwd=None, log=None, timeout=None):
    """Runs a command; returns (exit code, output). A command over its time limit counts as failed."""
    try:
        done = subprocess.run(command, cwd=cwd, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                              text=True, errors="replace", timeout=timeout)
        code, output = done.returncode, done.stdout
    except subprocess.TimeoutExpired as expired:
        partial = expired.stdout or ""
        if isinstance(partial, bytes):
            partial = partial.decode(errors="replace")
        code, output = 124, partial + "\n(time limit)"
    if log:
        with open(log, "a", encoding="utf-8") as out:
            out.write(f"$ {' '.join(command)}\n{output}\n")
    return code, output


def tracked_files():
    code, output = run(["git", "ls-files", "-z"], cwd=HERE)
    if code:
        sys.exit("git ls-files failed")
    return [name for name in output.split("\0") if name]


def sync_copy(tree):
    """Copies the tracked files into the tree; unchanged files keep their times (builds stay incremental)."""
    names = tracked_files()
    for name in names:
        source, target = os.path.join(HERE, name), os.path.join(tree, name)
        if not os.path.isfile(source):
            continue
        with open(source, "rb") as f:
            data = f.read()
        if os.path.isfile(target):
            with open(target, "rb") as f:
                if f.read() == data:
                    continue
        os.makedirs(os.path.dirname(target), exist_ok=True)
        with open(target, "wb") as f:
            f.write(data)
        os.chmod(target, os.stat(source).st_mode)
    return names


def locate(tree, names, path):
    """The row's file, or the one tracked file of that base name when it has moved; None otherwise."""
    if os.path.isfile(os.path.join(tree, path)):
        return path
    base = os.path.basename(path)
    moved = [name for name in names if os.path.basename(name) == base]
    return moved[0] if len(moved) == 1 else None


class Planter:
    def __init__(self, args):
        self.args = args
        self.work = os.path.abspath(args.work)
        # Same depth below the compiler cache's base directory as the worktree's own build/,
        # so the cache serves the copy's compilations too.
        self.tree = os.path.join(self.work, "tree")
        self.build = os.path.join(self.tree, "build")
        self.log = os.path.join(self.work, "plant-faults.log")
        self.targets = set()
        self.baseline_failures = set()

    def build_targets(self, targets):
        command = ["cmake", "--build", self.build, "-j2"]
        for target in sorted(targets):
            command += ["--target", target]
        return run(command, log=self.log)[0] == 0

    def configure(self):
        os.makedirs(self.work, exist_ok=True)
        self.names = sync_copy(self.tree)
        code, _ = run(["cmake", "-S", self.tree, "-B", self.build,
                       f"-DCMAKE_TOOLCHAIN_FILE={self.tree}/cmake/mingw-w64-x86_64.cmake",
                       "-DCMAKE_BUILD_TYPE=RelWithDebInfo"], log=self.log)
        if code or not self.build_targets(["all"]):
            sys.exit(f"the unchanged copy does not build: see {self.log}")
        code, output = run(["cmake", "--build", self.build, "--target", "help"])
        self.targets = set(re.findall(r"^\.\.\. (\S+)", output, re.M))

    def tests_of(self, regex):
        code, output = run(["ctest", "-N", "-R", regex], cwd=self.build)
        return re.findall(r"Test\s+#\d+: (\S+)", output)

    def ctest(self, regex):
        """Failed tests (name, with the failing test cases) of one ctest run under a virtual screen."""
        command = ["xvfb-run", "-a", "-s", "-screen 0 1280x1024x24", "ctest", "--output-on-failure",
                   "-j2", "--timeout", str(self.args.timeout), "-R", f"wine_prefix|{regex}"]
        for attempt in range(3):
            code, output = run(command, cwd=self.build, log=self.log)
            if "already active" not in output:
                break
            time.sleep(2)
        failed = re.findall(r"^\s*\d+ - (\S+) \((.*)\)$", output, re.M)
        cases = sorted(set(re.findall(r"^\[  FAILED  \] (\w+\.\w+)", output, re.M)))
        if re.search(r"^FATAL: exception 0x", output, re.M):
            cases.append("a crash")
        cases += [f"{name}: {status.lower()}" for name, status in failed if status != "Failed"]
        ran = re.search(r"tests passed, (\d+) tests failed out of (\d+)", output)
        return [name for name, _ in failed if name != "wine_prefix"], cases, ran is not None

    def regex_of(self, row):
        return "." if self.args.full else row["tests"]

    def baseline(self, rows):
        regex = "|".join(sorted({self.regex_of(row) for row in rows}))
        failed, cases, ran = self.ctest(regex)
        if not ran:
            sys.exit(f"the tests did not run on the unchanged copy: see {self.log}")
        self.baseline_failures = set(failed)
        if failed:
            print(f"failing without any fault (not counted as catches): {', '.join(failed)}", file=sys.stderr)

    def plant(self, row):
        path = locate(self.tree, self.names, row["file"])
        if not path:
            return "not planted (file not found)", path
        full = os.path.join(self.tree, path)
        with open(full, encoding="utf-8") as f:
            original = f.read()
        count = original.count(row["find"])
        if count != 1:
            return f"not planted (text found {count} times)", path
        with open(full, "w", encoding="utf-8") as f:
            f.write(original.replace(row["find"], row["replace"]))
        try:
            tests = self.tests_of(self.regex_of(row))
            targets = {test for test in tests if test in self.targets}
            if self.args.full or len(targets) < len(tests):
                targets = {"all"}
            if not self.build_targets(targets or {"all"}):
                return "not planted (does not compile)", path
            failed, cases, ran = self.ctest(self.regex_of(row))
            failed = [name for name in failed if name not in self.baseline_failures]
            if failed:
                return "caught by " + ", ".join(failed) + (f" ({', '.join(cases)})" if cases else ""), path
            return "missed" if ran else "not run (ctest gave no summary)", path
        finally:
            with open(full, "w", encoding="utf-8") as f:
                f.write(original)


def report(rows, results):
    lines = ["| fault | file | what the user would meet | result |", "|---|---|---|---|"]
    for row in rows:
        result, path = results[row["id"]]
        lines.append(f"| {row['id']} | `{path or row['file']}` | {row['user']} | {result} |")
    caught = sum(1 for result, _ in results.values() if result.startswith("caught"))
    lines.append("")
    lines.append(f"{caught} of {len(results)} planted faults caught.")
    return "\n".join(lines)


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("ids", nargs="*", help="rows to run (default: all)")
    parser.add_argument("--full", action="store_true", help="run the whole suite for each fault")
    parser.add_argument("--table", default=TABLE)
    parser.add_argument("--work", default=os.path.join(HERE, "build-faults"),
                        help="the copy and its build directory (default build-faults/)")
    parser.add_argument("--report", help="write the Markdown report into this file too")
    parser.add_argument("--no-baseline", action="store_true",
                        help="skip the run on the unchanged copy (it passed in this directory just before)")
    parser.add_argument("--timeout", type=int, default=240, help="seconds per test program")
    args = parser.parse_args()
    rows = read_table(args.table)
    if args.ids:
        unknown = set(args.ids) - {row["id"] for row in rows}
        if unknown:
            sys.exit(f"no such rows: {', '.join(sorted(unknown))}")
        by_id = {row["id"]: row for row in rows}
        rows = [by_id[i] for i in dict.fromkeys(args.ids)]  # in the order given
    planter = Planter(args)
    planter.configure()
    if not args.no_baseline:
        planter.baseline(rows)
    results = {}
    for row in rows:
        started = time.time()
        results[row["id"]] = planter.plant(row)
        print(f"{row['id']}: {results[row['id']][0]} ({time.time() - started:.0f} s)", flush=True)
        if args.report:  # kept up to date, so that a run cut short still has its table
            with open(args.report, "w", encoding="utf-8") as out:
                out.write(report([r for r in rows if r["id"] in results], results) + "\n")
    planter.build_targets({"all"})  # leaves the copy built as it is
    print(report(rows, results))


if __name__ == "__main__":
    main()
