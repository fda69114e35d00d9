# SPDX-License-Identifier: MIT
# Sets up what the top-level commands need: packages, configuration, build. Sourced, never run.
#
# Prints nothing when there is nothing to do. What it has to say goes to stderr; stdout belongs to
# the program that is run afterwards.

kSetupFailed=70   # no exit code of the tool, nor one of ctest

orin_root=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)

orin_say() { printf '%s\n' "$*" >&2; }

orin_fail() {
  orin_say "$@"
  exit "$kSetupFailed"
}

# orin_packages LIST...: the package names in the lists, comments left out.
orin_packages() { sed -e 's/#.*//' -e 's/[[:space:]]//g' -e '/^$/d' "$@"; }

# orin_missing_packages LIST...: those of them that are not installed, one a line.
orin_missing_packages() {
  orin_packages "$@" | sort -u | comm -23 - <(
    orin_packages "$@" | xargs dpkg-query -W -f '${db:Status-Status} ${Package}\n' 2>/dev/null |
      sed -n 's/^installed //p' | sort -u)
}

# orin_require LIST...: installs what is missing of the lists.
orin_require() {
  [ -z "${ORIN_SKIP_PACKAGES:-}" ] || return 0
  if ! command -v dpkg-query apt-get >/dev/null; then
    orin_fail "This is no Debian system: install what $* names in your system's own way," \
              "then run the same command again with ORIN_SKIP_PACKAGES=1."
  fi
  local missing
  missing=$(orin_missing_packages "$@" | tr '\n' ' ')
  [ -n "$missing" ] || return 0

  local asRoot=()
  if [ "$(id -u)" -ne 0 ]; then
    command -v sudo >/dev/null ||
      orin_fail "Packages are missing, and only root can install them. As root, run:" \
                "apt-get update && apt-get install $missing"
    asRoot=(sudo)
  fi
  orin_say "Installing: $missing"
  local log
  log=$(mktemp)
  # shellcheck disable=SC2086  # a list of names, split on purpose
  if ! { "${asRoot[@]}" apt-get update &&
         "${asRoot[@]}" env DEBIAN_FRONTEND=noninteractive \
           apt-get install --yes --no-install-recommends $missing; } </dev/null >"$log" 2>&1; then
    tail -n 20 "$log" >&2
    rm -f "$log"
    orin_fail "The packages could not be installed; apt-get's last words are above."
  fi
  rm -f "$log"
}

# orin_run_logged WHAT LOG COMMAND...: runs a step in silence; shows the end of its output when it
# fails.
orin_run_logged() {
  local what=$1 log=$2
  shift 2
  if ! "$@" </dev/null >"$log" 2>&1; then
    tail -n 60 "$log" >&2
    orin_fail "$what failed; the end of its output is above, all of it in $log."
  fi
}

# orin_configured DIR: whether DIR holds a complete configuration of this very checkout.
orin_configured() {
  [ -f "$1/build.ninja" ] &&
    grep -qxF "CMAKE_HOME_DIRECTORY:INTERNAL=$orin_root" "$1/CMakeCache.txt" 2>/dev/null
}

# orin_build PRESET: configures and builds `build/PRESET`, one caller at a time.
orin_build() {
  local preset=$1 dir=$orin_root/build/$1
  mkdir -p "$dir"
  exec {lock}>"$dir/.setup-lock"
  flock "$lock"
  if ! orin_configured "$dir"; then
    orin_say "Building in build/$preset; this takes a few minutes the first time."
    if command -v ccache >/dev/null; then export CMAKE_CXX_COMPILER_LAUNCHER=ccache; fi
    orin_run_logged "The configuration" "$dir/configure.log" \
      env -C "$orin_root" cmake --fresh --preset "$preset"
  fi
  orin_run_logged "The build" "$dir/build.log" env -C "$orin_root" cmake --build --preset "$preset"
  exec {lock}>&-
}
