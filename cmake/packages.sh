# shellcheck shell=bash
# The Debian packages that the project needs, and how ./check and ./demo get them. Sourced, not run.

# shellcheck disable=SC2034  # used by those who source this file
BUILD_PACKAGES=(g++ cmake ninja-build pkg-config python3 binutils
  libsqlite3-dev sqlite3 nettle-dev libfmt-dev libcli11-dev nlohmann-json3-dev libgtest-dev libgmock-dev python3-jsonschema)
# shellcheck disable=SC2034
CHECK_PACKAGES=(git clang-14 clang-tidy-14 clang-format-14 libclang-rt-14-dev llvm-14 shellcheck mandoc
  strace e2fsprogs xfsprogs btrfs-progs)

# For bench/run alone: the measuring, and what we are measured against.
# shellcheck disable=SC2034
BENCH_PACKAGES=(libbenchmark-dev rapidjson-dev libsimdjson-dev libpugixml-dev libexpat1-dev)

# need_packages PACKAGE... installs what is missing when we are root, and otherwise says what to install.
need_packages() {
  local missing=() package
  for package in "$@"; do
    if ! dpkg-query -W -f '${db:Status-Status}\n' "$package" 2>/dev/null | grep -qx installed; then
      missing+=("$package")
    fi
  done
  [ ${#missing[@]} -eq 0 ] && return 0
  if [ "$(id -u)" -ne 0 ]; then
    echo "These Debian packages are missing; install them as root, then start again:" >&2
    echo "    apt-get install ${missing[*]}" >&2
    return 1
  fi
  echo "Installing ${missing[*]}"
  local log
  log=$(mktemp) || return 1
  if ! { apt-get -qq update && DEBIAN_FRONTEND=noninteractive apt-get -qq install --no-install-recommends \
    "${missing[@]}"; } >"$log" 2>&1 </dev/null; then
    cat "$log" >&2
    rm -f "$log"
    echo "Could not install the packages above; see apt-get's messages." >&2
    return 1
  fi
  rm -f "$log"
}
