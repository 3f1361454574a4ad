#!/bin/sh
# Installs the packages in a bare Debian 12, runs their tests there, removes them, and looks for
# what they left. Needs root, and a network for what the packages depend on.
#
#   packaging/package_test.sh [FOLDER]    the folder with the packages; build/packages if none
#
# The bare system is made once, in FOLDER/bookworm, and copied for each run to FOLDER/root. It has
# no services running and no /proc but its own. Takes some five minutes, most of them for fetching.
set -eu
cd "$(dirname "$0")/.."

folder=${1:-build/packages}
tests="kzfp c cpp java python postgresql"
if [ "$(id -u)" -ne 0 ]; then
    echo "package_test: needs root, to install packages in a system of its own" >&2
    exit 1
fi
if ! ls "$folder"/*.deb >/dev/null 2>&1; then
    echo "package_test: no packages in $folder; ./run package makes them" >&2
    exit 1
fi
folder=$(cd "$folder" && pwd)
base=$folder/bookworm
root=$folder/root

leave() {
    if mountpoint -q "$root/proc"; then
        umount "$root/proc"
    fi
}
trap leave EXIT
leave

inside() {
    chroot "$root" env -i PATH=/usr/sbin:/usr/bin:/sbin:/bin HOME=/root LC_ALL=C.UTF-8 \
        DEBIAN_FRONTEND=noninteractive "$@"
}

# What is done is printed as a user would type it; what apt prints goes to a file.
quietly() {
    echo "# $*"
    if ! inside "$@" >"$folder/apt.log" 2>&1; then
        cat "$folder/apt.log"
        exit 1
    fi
}

make_base() {
    if [ -e "$base/etc/debian_version" ] && [ ! -d "$base/debootstrap" ]; then
        return
    fi
    rm -rf "$base"
    debootstrap --variant=minbase bookworm "$base" http://deb.debian.org/debian >"$folder/debootstrap.log"
}

make_root() {
    rm -rf "$root"
    cp -a "$base" "$root"
    cp /etc/resolv.conf "$root/etc/resolv.conf"
    # No service is started.
    printf '#!/bin/sh\nexit 101\n' >"$root/usr/sbin/policy-rc.d"
    chmod +x "$root/usr/sbin/policy-rc.d"
    # It may be lost with the machine: no waiting for the disk.
    echo force-unsafe-io >"$root/etc/dpkg/dpkg.cfg.d/unsafe-io"
    mount -t proc proc "$root/proc"
    mkdir -p "$root/packages" "$root/tests" "$root/demo"
    for package in "$folder"/*.deb; do
        case $package in
        *-dbgsym_*) ;; # what debuggers read
        *) cp "$package" "$root/packages" ;;
        esac
    done
    cp packaging/debian/tests/* "$root/tests"
}

# The demo's music, where it was made; the tests make some of their own otherwise.
copy_demo() {
    media=${KZ_MEDIA:-build/media}
    if [ -s "$media/demo/clip.wav" ]; then
        cp "$media/music.wav" "$media/demo/clip.wav" "$root/demo"
        cp "$media/demo/holotz-castle.wav" "$root/demo/other.wav"
    fi
}

# The packages that tests name beside ours.
tools_of_tests() {
    sed -n 's/^Depends: //p' packaging/debian/tests/control | tr ',' '\n' | tr -d ' ' | sort -u |
        grep -v -e kz | tr '\n' ' '
}

run_tests() {
    demo=
    if [ -s "$root/demo/clip.wav" ]; then
        demo=/demo
    fi
    for name in $tests; do
        echo
        echo "## $name"
        inside env "KZ_DEMO=$demo" "/tests/$name" 2>&1
    done
}

# Files, settings and entries of the package manager.
# shellcheck disable=SC2016 # dpkg-query expands them
left_behind() {
    inside sh -c 'find / -xdev \( -path /proc -o -path /packages -o -path /tests -o -path /demo -o -path /tmp \) \
            -prune -o \( -name "*kzsdk*" -o -name "*kzcat*" -o -name "*kzfp*" -o -name "*kzmatch*" \) -print
        dpkg-query -W -f "\${Package} \${db:Status-Status}\n" | grep kz || true'
}

make_base
make_root
copy_demo
quietly apt-get update
# As a user does it who has the files alone; apt fetches what they depend on.
quietly sh -c 'apt-get install -y --no-install-recommends /packages/*.deb'
# shellcheck disable=SC2016 # dpkg-query expands them
inside dpkg-query -W -f '${binary:Package} ${Version} ${db:Status-Status}\n' | grep kz
# shellcheck disable=SC2046 # the names are meant to be split
quietly apt-get install -y --no-install-recommends $(tools_of_tests)
cp -n "$root"/var/cache/apt/archives/*.deb "$base/var/cache/apt/archives/"
run_tests

echo
echo "## purge"
# shellcheck disable=SC2016
names=$(inside dpkg-query -W -f '${Package}\n' | grep kz | tr '\n' ' ')
# shellcheck disable=SC2086 # the names are meant to be split
quietly apt-get purge -y $names
left=$(left_behind)
if [ -n "$left" ]; then
    echo "package_test: left behind:" >&2
    echo "$left" >&2
    exit 1
fi
echo "Nothing is left."
leave
rm -rf "$root"
