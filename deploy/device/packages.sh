# shellcheck shell=bash
# Names of the Debian packages that each step needs, and their installation. To be sourced.

BUILD_PACKAGES=(g++ cmake ninja-build pkg-config libjsoncpp-dev libapparmor-dev libssl-dev libpam0g-dev libsqlite3-dev
    libcurl4-openssl-dev libarchive-dev)
DEVICE_PACKAGES=(lighttpd lighttpd-mod-openssl busybox curl libarchive13 libcurl4 media-types openssl python3)
TEST_PACKAGES=(libgtest-dev nodejs)
CHECK_PACKAGES=(clang-14 clang-format-14 clang-tidy shellcheck)
export BUILD_PACKAGES DEVICE_PACKAGES TEST_PACKAGES CHECK_PACKAGES

as_root() {
    if ((EUID == 0)); then
        "$@"
    elif command -v sudo >/dev/null; then
        sudo -- "$@"
    else
        echo "this needs root: run it as root or install sudo" >&2
        return 1
    fi
}

package_is_installed() {
    [[ $(dpkg-query --show --showformat='${db:Status-Abbrev}' "$1" 2>/dev/null) == ii* ]]
}

# The package of the web server starts a server of its own on port 80. Nobody asked for that one.
install_without_services() {
    local policy=/usr/sbin/policy-rc.d made=no status=0
    if [[ ! -e $policy ]]; then
        made=yes
        printf '#!/bin/sh\nexit 101\n' | as_root install -m 0755 /dev/stdin "$policy"
    fi
    as_root env DEBIAN_FRONTEND=noninteractive \
        apt-get install -y --no-install-recommends "$@" </dev/null >&2 || status=$?
    if [[ $made == yes ]]; then
        as_root rm -f "$policy"
    fi
    if [[ " $* " == *" lighttpd "* && -d /run/systemd/system ]]; then
        as_root systemctl disable --quiet lighttpd.service
    fi
    return "$status"
}

install_packages() {
    local name missing=()
    for name in "$@"; do
        package_is_installed "$name" || missing+=("$name")
    done
    if ((${#missing[@]} > 0)); then
        echo "installing ${missing[*]}" >&2
        as_root env DEBIAN_FRONTEND=noninteractive apt-get update </dev/null >&2
        install_without_services "${missing[@]}"
    fi
}
