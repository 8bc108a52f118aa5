#!/usr/bin/python3
"""Plays the phone's first-boot wizard: asks the application for its page, and prints what the two say to each other.

usage: tools/first_boot.py [--build DIR] [--second]

It runs in the session that it is started in, with the application that is installed there or built in DIR. --second asks
for the page after a sign-in. "Previous" ends there too: a person would come forward again by herself."""

import argparse
import os
import re
import subprocess
import sys

PAGES = ("Language", "Velora", "All set")  # ours is the one in the middle
MODE, MODE_SECOND = "Setup_Wizard_Velora_Signin", "Setup_Wizard_Velora_Signin2"
STEPS = {"rbutton_next": 1, "rbutton_skip": 1, "lbutton_click": -1}
REQUEST = ("--extra", f"launch_mode={MODE}")


def answer_of(reply):
    """What a reply line of velora-launch says: one of STEPS, or None."""
    found = re.search(r"^reply: SUCCEEDED.* result=(\w+)", reply)
    return found.group(1) if found and found.group(1) in STEPS else None


def told(reply):
    """The wizard's side of the conversation, as lines."""
    answer = answer_of(reply)
    yield f"velora  {reply or '(no reply)'}"
    if answer:
        yield f"wizard  {answer}: on to the page {PAGES[1 + STEPS[answer]]!r}"
    else:
        yield "wizard  this says nothing of where to go: the page is shown again at the next start"


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--build", default=os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "build"))
    parser.add_argument("--second", action="store_true")
    options = parser.parse_args()
    extra = f"launch_mode={MODE_SECOND if options.second else MODE}"
    print(f"wizard  page 2 of {len(PAGES)} is Velora's: {extra}", flush=True)
    built = os.path.join(options.build, "platform/app/velora-launch")
    done = subprocess.run([built if os.path.exists(built) else "velora-launch", "--extra", extra], check=False,
                          stdout=subprocess.PIPE, text=True)
    print(*told(done.stdout.strip()), sep="\n")
    return 0 if answer_of(done.stdout.strip()) else 1


if __name__ == "__main__":
    sys.exit(main())
