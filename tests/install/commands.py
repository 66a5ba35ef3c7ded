"""Runs other programs, with what they said in the failure if they fail."""

import os
import subprocess


def run(*command, cwd=None, env=None, **environment):
    result = subprocess.run([str(part) for part in command], text=True, capture_output=True, cwd=cwd,
                            env={**(os.environ if env is None else env), **environment})
    if result.returncode != 0:
        raise AssertionError(f"{command}\n{result.stdout}{result.stderr}")
    return result.stdout
