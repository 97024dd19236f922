"""The completion of a program for bash, asked as bash asks it."""

import os
import pathlib
import subprocess

COMPLETIONS = pathlib.Path(__file__).resolve().parents[2] / "packaging" / "completion"

# Prints what is offered for the last of the words.
ASK = """
set -u
. "$0"
complete -p "$1" >/dev/null || exit
COMP_WORDS=("$@")
COMP_CWORD=$(($# - 1))
"_${1//-/_}"
for offer in "${COMPREPLY[@]}"; do
    printf '%s\\n' "$offer"
done
"""


def offered(name, words, folder, path=os.environ["PATH"]):
    """What bash offers behind these words, in this folder."""
    done = subprocess.run(["/bin/bash", "-c", ASK, COMPLETIONS / f"{name}.bash", name, *words],
                          cwd=folder, env={"PATH": path}, check=True, capture_output=True,
                          text=True)
    assert done.stderr == ""
    return sorted(done.stdout.splitlines())
