# shellcheck shell=bash
# Sourced by ./run, ./test and ./bench: installs what is missing, builds a preset, and says in short lines what is being done.
#
# Expects `set -euo pipefail` and the project's folder as working directory. A step's whole output stands in
# build/logs/STEP.log, or in another folder that `logs` names; the terminal sees it when the step fails, or as it comes when
# PALISADE_VERBOSE is 1.

say() { printf '%s\n' "$*"; }

fail() {
  printf '%s\n' "$*" >&2
  exit 1
}

# What each step's command is run under, word by word.
under=()

# step NAME SENTENCE COMMAND...: runs the command, says what it does and how long that took.
step() {
  local log="${logs:-build/logs}/$1.log" sentence=$2 started=$SECONDS
  shift 2
  mkdir -p "${log%/*}"
  if [ "${PALISADE_VERBOSE:-0}" = 1 ]; then
    say "$sentence"
    "${under[@]}" "$@" || fail "Failed: $sentence"
  else
    printf '%s ... ' "$sentence"
    if ! "${under[@]}" "$@" >"$log" 2>&1 </dev/null; then
      say "failed after $((SECONDS - started)) s"
      # Of a test run only what went wrong is of interest, of anything else all of it.
      grep -vE '^ *(Start +[0-9]+:|[0-9]+/[0-9]+ Test .* (Passed|\*\*\*Skipped))' "$log" >&2 || true
      fail "Failed: $sentence (all of its output: $log)"
    fi
    say "$((SECONDS - started)) s"
  fi
}

# missing_packages GROUP...: the packages of these groups that are not installed.
missing_packages() {
  local wanted
  wanted=$(awk -v groups=" $* " '!/^#/ && NF == 2 && index(groups, " " $1 " ") { print $2 }' Tools/packages | sort -u)
  [ -n "$wanted" ] || return 0
  # shellcheck disable=SC2086 # one word a package
  comm -23 <(printf '%s\n' "$wanted") \
    <(dpkg-query --show --showformat='${Package} ${db:Status-Status}\n' $wanted 2>/dev/null |
      awk '$2 == "installed" { print $1 }' | sort -u)
}

# install_missing GROUP...: installs the groups' packages; needs no network when all of them are there.
install_missing() {
  local missing as_root=()
  if ! command -v dpkg-query >/dev/null; then
    say "This is no Debian system: going on with the tools that are here. Tools/packages lists what is needed."
    return
  fi
  missing=$(missing_packages "$@" | tr '\n' ' ')
  missing=${missing% }
  [ -n "$missing" ] || return 0
  if [ "$(id -u)" != 0 ]; then
    command -v sudo >/dev/null ||
      fail "These packages are missing: $missing" \
        "Installing them takes root, and there is no sudo here. As root: apt-get install $missing"
    as_root=(sudo)
  fi
  step packages-list "Reading Debian's package lists" "${as_root[@]}" apt-get update -o Acquire::Retries=3
  # shellcheck disable=SC2086 # one word a package
  step packages-install "Installing $missing" "${as_root[@]}" env DEBIAN_FRONTEND=noninteractive \
    apt-get install --yes --no-install-recommends -o Acquire::Retries=3 -o DPkg::Lock::Timeout=300 $missing
}

# configure PRESET OPTION...
configure() {
  local preset=$1
  shift
  step "$preset-configure" "$preset: configuring" cmake --preset "$preset" "$@"
}

# build PRESET OPTION...
build() {
  local preset=$1
  shift
  step "$preset-build" "$preset: building" cmake --build --preset "$preset" "$@"
}
