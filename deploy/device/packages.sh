# shellcheck shell=bash
# Names of the Debian packages that each step needs, and their installation. To be sourced.

BUILD_PACKAGES=(g++ cmake ninja-build pkg-config libjsoncpp-dev libapparmor-dev libssl-dev libpam0g-dev libsqlite3-dev
    libcurl4-openssl-dev libarchive-dev)
DEVICE_PACKAGES=(lighttpd lighttpd-mod-openssl busybox curl libarchive13 libcurl4 media-types openssl python3)
TEST_PACKAGES=(libgtest-dev nodejs strace nginx-light fcgiwrap apache2 libapache2-mod-xsendfile chromium chromium-driver)
CHECK_PACKAGES=(clang-14 clang-format-14 clang-tidy libclang-rt-14-dev llvm-14 shellcheck)
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

disable_services() {
    local name
    for name in "$@"; do
        case $name in
            lighttpd | apache2) as_root systemctl disable --quiet "$name.service" ;;
            nginx-light) as_root systemctl disable --quiet nginx.service ;;
            fcgiwrap) as_root systemctl disable --quiet fcgiwrap.service fcgiwrap.socket ;;
        esac
    done
}

# The packages of web servers start servers of their own on port 80. Nobody asked for those.
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
    if [[ -d /run/systemd/system ]]; then
        disable_services "$@"
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
