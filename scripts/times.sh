# SPDX-License-Identifier: Apache-2.0
# shellcheck shell=bash
# For scripts to source: runs steps, records the result and the time of each, and shows both as a table.

step_rows=()
failed_steps=()

# The exit code of a step that cannot run on this machine. The step itself prints the reason.
SKIPPED=77

# run_step NAME COMMAND…: runs the command in a subshell, which ends at the first command that fails. Always succeeds itself;
# a step that failed is added to failed_steps. A skipped step has neither passed nor failed.
run_step() {
  local name="$1" started=$SECONDS result=passed status
  shift
  set +e
  (set -e; "$@")
  status=$?
  set -e
  if [[ $status -eq $SKIPPED ]]; then
    result=skipped
  elif [[ $status -ne 0 ]]; then
    result=FAILED
    failed_steps+=("$name")
  fi
  step_rows+=("$(printf '%-10s %-7s %4d s' "$name" "$result" "$((SECONDS - started))")")
}

# show_steps TITLE: shows the table; its last row is the time of the whole script.
show_steps() {
  echo "=== $1"
  printf '  %s\n' "${step_rows[@]}"
  printf '  %-10s %-7s %4d s\n' total '' "$SECONDS"
}

# show_slowest COUNT FILE…: shows the slowest tests in JUnit files that ctest wrote, each with the preset of its build.
show_slowest() {
  local count="$1" file
  shift
  for file in "$@"; do
    sed -nE 's/.*<testcase name="([^"]*)".* time="([0-9.]+)".*/\2 \1/p' "$file" |
      sed "s|\$| ($(basename "$(dirname "$file")"))|"
  done | sort -rn | sed -n "1,${count}p" | while read -r seconds name; do
    printf '  %7.1f s  %s\n' "$seconds" "$name"
  done
}
