# SPDX-License-Identifier: Apache-2.0
"""The program of examples/other_service, compiled with the build's libraries and run against the service."""

import os
import re
import subprocess

import deployment

DATE = r"\d{4}-\d\d-\d\dT[0-9:.]+Z"
TOKEN = f"{re.escape(deployment.USER)}, in {' '.join(group['name'] for group in deployment.GROUPS)}, from {DATE} to {DATE}\n"
OUTPUT = re.compile(f"acquired: {TOKEN}renewed: {TOKEN}valid\nexchanged: {TOKEN}")


def failures(root, build, folder, url):
    """Compiles and runs the program. Returns a list of what is wrong, which is empty if nothing is."""
    libraries = [build.resolve() / "src", build.resolve() / "tarvel"]
    paths = [option for library in libraries for option in (f"-L{library}", f"-Wl,-rpath,{library}")]
    compiled = subprocess.run(
        ["g++", "-std=c++17", f"-I{root}/include", f"-I{root}/tarvel/include", root / "examples" / "other_service" / "main.cpp",
         *paths, "-lssoclient", "-ltarvel", "-o", folder / "other_service"], capture_output=True, text=True, check=False)
    if compiled.returncode != 0:
        return [f"interop: examples/other_service does not compile: {compiled.stderr}"]
    environment = {**os.environ, "STS_URL": url + "/sts", "STS_CA": "ca.pem", "STS_CERT": "sts.pem",
                   "STS_USER": deployment.USER, "STS_PASSWORD": deployment.PASSWORD}
    done = subprocess.run([folder / "other_service", "client.pem", "client.key"], cwd=folder, env=environment,
                          capture_output=True, text=True, check=False, timeout=120)
    if done.returncode == 0 and OUTPUT.fullmatch(done.stdout):
        return []
    return [f"interop: examples/other_service: exit code {done.returncode}\n{done.stdout}{done.stderr}"]
