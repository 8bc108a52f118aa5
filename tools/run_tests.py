#!/usr/bin/python3
"""Runs the tests of a build folder and counts their cases; the last line is "N passed, N failed".

With --again a test program that failed runs once more, alone: programs that talk to others have limits of time, which a
machine with other things to do can miss. Then it is the second time that counts, and the first is told as "# failed once".
A program that a signal ended, or of which a sanitizer told something, gets no second time. With --suite only what that
suite needs is built, without it nothing.

usage: run_tests.py [--suite SUITE] [--again] BUILD     $TEST_TIMEOUT_MULTIPLIER stretches the tests' time limits"""

import argparse
import json
import os
import re
import subprocess
import sys
import xml.etree.ElementTree as tree

# Also what the tour says, which gives its ways their second time itself.
FINAL = re.compile(r"(Address|Leak|Thread|Memory|UndefinedBehavior)Sanitizer|runtime error:|# failed once")


def run(build, *options):
    """Meson's exit status, {test: (case, "passed", "failed" or "skipped") of all} and the tests worth a second time."""
    logs = os.path.join(build, "meson-logs")
    for name in ("testlog.junit.xml", "testlog.json"):
        if os.path.exists(os.path.join(logs, name)):
            os.remove(os.path.join(logs, name))
    command = ["meson", "test", "-C", build, "--print-errorlogs", "-t", os.environ.get("TEST_TIMEOUT_MULTIPLIER", "1")]
    status = subprocess.run([*command, *options], check=False).returncode
    cases, worth = {}, []
    try:
        suites = list(tree.parse(os.path.join(logs, "testlog.junit.xml")).iter("testsuite"))
        with open(os.path.join(logs, "testlog.json"), encoding="utf-8") as log:
            tests = [json.loads(line) for line in log]
    except (OSError, ValueError, tree.ParseError) as error:
        print(f"tools/run_tests.py: no report of the tests: {error}")
        return status or 1, cases, worth
    for suite in suites:
        for case in suite.iter("testcase"):
            # A program that ends without a report of its cases is one case by itself.
            test = suite.get("name") if " / " in suite.get("name") else f"{suite.get('name')}.{case.get('name')}"
            wrong = case.find("failure") is not None or case.find("error") is not None
            result = "failed" if wrong else "skipped" if case.find("skipped") is not None else "passed"
            cases.setdefault(test, []).append((case.get("name"), result))
    for test in tests:
        said = test.get("stdout", "") + test.get("stderr", "")
        # Meson keeps these lines of a program that prints the Test Anything Protocol to itself.
        for words in re.findall(r"^# failed once.*$|^not ok.*(?:\n#.*){0,40}", test.get("stdout", ""), re.M):
            print(words)
        if test["result"] in ("FAIL", "ERROR", "TIMEOUT") and not FINAL.search(said) and \
                (test["result"] == "TIMEOUT" or 0 < test["returncode"] < 128):
            worth.append(test["name"].split(" / ")[-1])
    return status, cases, worth


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--suite")
    parser.add_argument("--again", action="store_true")
    parser.add_argument("build")
    options = parser.parse_args()
    status, cases, worth = run(options.build, *(["--suite", options.suite] if options.suite else ["--no-rebuild"]))
    if options.again and worth:
        print("=== once more, alone:", ", ".join(worth), flush=True)
        _, second, _ = run(options.build, "--no-rebuild", "--num-processes", "1", *worth)
        for test, results in second.items():
            for name, result in cases.get(test, []):
                if result == "failed" and ("failed" not in (other for _, other in results)):
                    print("# failed once:", test, name)
            cases[test] = results
        left = [test for test, results in cases.items() if any(result == "failed" for _, result in results)]
        status = 1 if left or not second else 0
    results = [(test, name, result) for test, of_test in cases.items() for name, result in of_test]
    for wanted in ("failed", "skipped"):
        for test, name, result in results:
            if result == wanted:
                print(f"{wanted}:", test, name)
    count = [sum(result == wanted for *_, result in results) for wanted in ("passed", "failed")]
    print(f"{count[0]} passed, {count[1]} failed")
    return status


if __name__ == "__main__":
    sys.exit(main())
