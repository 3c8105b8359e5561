# Functions that ./run, ./test, .ci/run and benchmarks/run share. To be sourced by bash with
# `set -euo pipefail` in force; the caller's working directory becomes the top of the checkout.
# shellcheck shell=bash

cd "$(dirname "${BASH_SOURCE[0]}")/.." || exit

say() { printf '%s\n' "$*" >&2; }
heading() { printf '\n== %s\n' "$*" >&2; }
die() {
    say "$*"
    exit 1
}

is_root() { [[ $EUID -eq 0 ]]; }

# Runs a command and shows what it wrote only when it fails.
quietly() {
    local log
    log=$(mktemp)
    if ! "$@" >"$log" 2>&1; then
        cat "$log" >&2
        rm -f "$log"
        return 1
    fi
    rm -f "$log"
}

# The packages of the given purposes, one a line.
packages_for() {
    local purpose
    for purpose in "$@"; do
        awk -v purpose="$purpose" '$1 == purpose { print $2 }' tools/packages.txt
    done | sort -u
}

missing_packages() {
    local package
    for package in $(packages_for "$@"); do
        # shellcheck disable=SC2016  # the format is dpkg-query's
        if [[ $(dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null) != installed ]]; then
            printf '%s\n' "$package"
        fi
    done
}

# Installs what is missing for the given purposes; says nothing when nothing is.
need_packages() {
    if ! command -v dpkg-query >/dev/null; then
        say "This is no Debian: the following must be there under the names they have here:"
        say "$(packages_for "$@" | tr '\n' ' ')"
        return 0
    fi
    local missing
    mapfile -t missing < <(missing_packages "$@")
    if [[ ${#missing[@]} -eq 0 ]]; then
        return 0
    fi
    local as_root=()
    if ! is_root; then
        command -v sudo >/dev/null ||
            die "Please have these installed first: apt-get install ${missing[*]}"
        as_root=(sudo)
    fi
    say "Installing ${missing[*]}"
    local apt=("${as_root[@]}" env DEBIAN_FRONTEND=noninteractive apt-get -q -y)
    { quietly "${apt[@]}" update &&
        quietly "${apt[@]}" install --no-install-recommends "${missing[@]}"; } ||
        die "These could not be installed: ${missing[*]}"
}

# build_preset PRESET [TARGET...]: configures and builds. Silent when everything is built; the first
# build says so, and shows on a terminal how far it is.
build_preset() {
    local preset=$1 folder=build/$1 show=quietly
    shift
    if [[ $preset == release ]]; then
        folder=build
    fi
    if command -v ccache >/dev/null; then
        export CMAKE_CXX_COMPILER_LAUNCHER=ccache CCACHE_SLOPPINESS=pch_defines,time_macros
    fi
    if [[ ! -f $folder/.ninja_log ]]; then
        say "Building ($preset); the first time takes some minutes"
        if [[ -t 2 ]]; then
            show=
        fi
    fi
    if [[ ! -f $folder/build.ninja ]]; then
        quietly cmake --preset "$preset" || die "The build could not be configured"
    fi
    ${show:+"$show"} cmake --build "$folder" ${1+--target "$@"} -- ${show:+--quiet} >&2 ||
        die "The build failed"
}

# Our sources of the given file name patterns, one a line.
our_sources() {
    local pattern names=()
    for pattern in "$@"; do
        names+=(${names[@]:+-o} -name "$pattern")
    done
    find platform providers host client tests benchmarks fuzz \( "${names[@]}" \) -type f | sort
}
