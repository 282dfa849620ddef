# Shared by the scripts one folder up, which source it. Debian package names: the project is built on Debian 12.

root=$(cd "$(dirname "${BASH_SOURCE[0]}")/../.." && pwd)
logs=$root/build/logs
mkdir -p "$logs"

say() { printf '%s: %s\n' "$(basename "$0")" "$*"; }

fail() {
    say "FAILED: $*" >&2
    exit 1
}

# Installs the packages that are missing and says so. Does nothing if all are installed.
require_packages() {
    local missing=() package
    for package in "$@"; do
        dpkg-query -W -f='${db:Status-Status}' "$package" 2>/dev/null | grep -qx installed || missing+=("$package")
    done
    [ ${#missing[@]} -eq 0 ] && return
    local as_root=()
    if [ "$(id -u)" -ne 0 ]; then
        command -v sudo >/dev/null || fail "these packages are missing, and there is no sudo to install them: ${missing[*]}"
        as_root=(sudo)
    fi
    say "installing ${missing[*]}"
    "${as_root[@]}" env DEBIAN_FRONTEND=noninteractive sh -c '
        apt-get update && apt-get install -y --no-install-recommends "$@"' sh "${missing[@]}" >"$logs/packages.log" 2>&1 </dev/null ||
        fail "apt-get could not install them; $logs/packages.log tells why"
}

# run_logged NAME COMMAND...: quiet unless it fails.
run_logged() {
    local log=$logs/$1.log
    shift
    if ! "$@" >"$log" 2>&1 </dev/null; then
        tail -n 60 "$log" >&2
        fail "$* ($log)"
    fi
}

# build_preset NAME OPTIONS...: configures with these options of cmake and builds; only the targets in $targets if it is set.
build_preset() {
    say "building preset $1"
    run_logged "configure-$1" cmake --preset "$1" "${@:2}"
    # shellcheck disable=SC2086 # several words
    run_logged "build-$1" cmake --build --preset "$1" --parallel "$(nproc)" ${targets:+--target $targets}
}

# test_preset NAME OPTIONS...: with these options of ctest. Prints only the summary line unless a test fails.
test_preset() {
    say "testing preset $1"
    ctest --preset "$1" --parallel "$(nproc)" --no-tests=error "${@:2}" >"$logs/test-$1.log" 2>&1 </dev/null || {
        sed -n '/\*\*\*/,$p' "$logs/test-$1.log" | tail -n 200 >&2
        fail "tests of preset $1 ($logs/test-$1.log)"
    }
    grep 'tests passed' "$logs/test-$1.log"
}

build_packages=(g++ cmake ninja-build git ca-certificates libtbb-dev)
program_packages=(libcli11-dev libfmt-dev nlohmann-json3-dev libopenvdb-dev libboost-dev libhdf5-dev zlib1g-dev)
test_packages=(libgtest-dev libgmock-dev libbenchmark-dev libtinyobjloader-dev clang clang-format clang-tidy abigail-tools binutils pkgconf)
python_packages=(python3 python3-dev pybind11-dev python3-numpy python3-distributed python3-rich python3-matplotlib)
python_test_packages=(python3-pytest mypy python3-vtk9)
package_packages=(dpkg-dev file lintian mmdebstrap)
fuzz_packages=(clang libclang-rt-14-dev libgtest-dev)
coverage_packages=(clang llvm python3)
page_test_packages=(chromium chromium-driver python3-selenium python3-numpy)
