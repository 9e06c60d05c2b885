#!/usr/bin/env bash
# Installs the Debian packages that are missing for the named jobs, and does nothing when none is missing.
#
#   cmake/setup-packages.sh JOB...     build, bench, fuzz, format, lint
#
# Only apt-get is used, as root or through sudo, without questions. Where there is no dpkg the packages are only named:
# the machine's owner knows better how to get them.
set -euo pipefail

packages=()
for job in "$@"; do
    case $job in
        # The library, the tool and the tests.
        build)
            packages+=(g++ cmake ninja-build libcli11-dev nlohmann-json3-dev libgtest-dev libgmock-dev)
            packages+=(libmd-dev libssl-dev libcrypt-dev pkg-config)
            ;;
        bench) packages+=(libbenchmark-dev) ;;
        # llvm brings the symbolizer, without which a finding is a list of addresses.
        fuzz) packages+=(clang libclang-rt-14-dev llvm) ;;
        format) packages+=(clang-format) ;;
        lint) packages+=(clang-format clang-tidy) ;;
        *)
            echo "setup: unknown job '$job'" >&2
            exit 2
            ;;
    esac
done

if ! command -v dpkg-query >/dev/null || ! command -v apt-get >/dev/null; then
    echo "setup: not a Debian system; these packages, or their like, are needed: ${packages[*]}" >&2
    exit 0
fi

missing=()
for package in "${packages[@]}"; do
    if [[ $(dpkg-query -W -f '${db:Status-Status}\n' "$package" 2>/dev/null | head -n 1) != installed ]]; then
        missing+=("$package")
    fi
done
[[ ${#missing[@]} -eq 0 ]] && exit 0

as_root=(env DEBIAN_FRONTEND=noninteractive)
if [[ $(id -u) -ne 0 ]]; then
    if ! command -v sudo >/dev/null; then
        echo "setup: please install as root: ${missing[*]}" >&2
        exit 1
    fi
    as_root=(sudo env DEBIAN_FRONTEND=noninteractive)
fi

echo "setup: installing ${missing[*]}"
wait_for_lock=(-o DPkg::Lock::Timeout=300)
# A foreign package source that doesn't answer is no reason to stop: whether the packages are there, the install tells.
"${as_root[@]}" apt-get "${wait_for_lock[@]}" -q update </dev/null ||
    echo "setup: the package lists could not all be read, going on" >&2
"${as_root[@]}" apt-get "${wait_for_lock[@]}" -q -y --no-install-recommends install "${missing[@]}" </dev/null
