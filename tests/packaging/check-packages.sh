#!/usr/bin/env bash
# Checks of the Debian packages a build tree makes (ctest label "package"):
#   check-packages.sh CHECK BUILD_DIR SOURCE_DIR VERSION MULTIARCH
# CHECK is one of build, lintian, contents, extracted, embedding, install. The packages are
# tolkatouch and libtolkatouch-dev, and python3-tolkatouch when the tree has the Python module.
# A missing tool is named, and the check fails: it never passes without having looked.
set -euo pipefail

[ $# -eq 5 ] || { echo "usage: check-packages.sh build|lintian|contents|extracted|embedding|install BUILD_DIR SOURCE_DIR VERSION MULTIARCH" >&2; exit 2; }
check=$1 build=$2 source=$3 version=$4 multiarch=$5
packages=(tolkatouch libtolkatouch-dev)
grep -q '^set(CPACK_COMPONENTS_ALL ".*\bpython\b' "$build/CPackConfig.cmake" && packages+=(python3-tolkatouch)
arch=$(dpkg --print-architecture 2>/dev/null || echo unknown)

fail() { echo "FAIL: $*" >&2; exit 1; }
need() {
    local tool=$1 package=$2
    command -v "$tool" >/dev/null 2>&1 ||
        fail "$tool is missing: install the Debian package $package (bash scripts/quickstart deps installs it)"
}
deb_of() { echo "$build/${1}_${version}_${arch}.deb"; }
make_scratch() {  # sets folder, removed when the check ends
    folder=$(mktemp -d "${TMPDIR:-/tmp}/tolkatouch-package-XXXXXX")
    trap 'rm -rf "$folder"' EXIT
}
extract_all() {
    local into=$1 package
    for package in "${packages[@]}"; do dpkg-deb -x "$(deb_of "$package")" "$into"; done
}
expect_same() {  # expect_same WHAT EXPECTED_FILE ACTUAL_FILE
    diff -u "$2" "$3" >&2 || fail "$1 differs (expected $2)"
}

need dpkg-deb dpkg
for package in "${packages[@]}"; do
    [ "$check" = build ] || [ -f "$(deb_of "$package")" ] || fail "$(deb_of "$package") was not built"
done

case $check in
build)
    need dpkg-shlibdeps dpkg-dev
    need file file
    for package in "${packages[@]}"; do rm -f "$(deb_of "$package")"; done
    # The package target builds what is out of date first, so the programs and the packages carry
    # the version of one configuration.
    cmake --build "$build" --target package || fail "the package target could not make the packages"
    for package in "${packages[@]}"; do
        [ -f "$(deb_of "$package")" ] || fail "no $(deb_of "$package")"
        [ "$(dpkg-deb -f "$(deb_of "$package")" Version)" = "$version" ] || fail "$package is not version $version"
    done
    echo "built: ${packages[*]} $version"
    ;;

lintian)
    need lintian lintian
    status=0
    for package in "${packages[@]}"; do
        lintian --fail-on error,warning "$(deb_of "$package")" || status=1
    done
    [ $status -eq 0 ] || fail "lintian reports errors or warnings"
    echo "lintian: no error and no warning"
    ;;

contents)
    libdir=usr/lib/$multiarch
    contents() { dpkg-deb -c "$(deb_of "$1")" | awk '{print $6}' | sed 's|^\./||'; }
    has() {  # has PACKAGE PATH
        contents "$1" | grep -x "$2" >/dev/null || fail "$1 lacks /$2"
    }
    for path in usr/bin/tolkatouch usr/sbin/tolkatouchd "$libdir/tolkatouch/tolkatouch-hidservice.so" \
                "$libdir/tolkatouch/libtolkatouch-platform.so.0" usr/lib/systemd/system/tolkatouchd.service \
                usr/lib/udev/rules.d/70-tolkatouch.rules usr/lib/sysusers.d/tolkatouch.conf \
                usr/lib/modules-load.d/tolkatouch.conf etc/tolkatouch/log.conf \
                usr/share/doc/tolkatouch/copyright usr/share/doc/tolkatouch/changelog.gz \
                usr/share/doc/tolkatouch/examples/everyday-session.json; do
        has tolkatouch "$path"
    done
    # Manual pages (compressed) and completions, from the install rules of packaging/man and
    # packaging/completions.
    if [ -d "$source/packaging/man" ]; then
        for path in usr/share/man/man1/tolkatouch.1.gz usr/share/man/man8/tolkatouchd.8.gz \
                    usr/share/bash-completion/completions/tolkatouch usr/share/bash-completion/completions/tolkatouchd; do
            has tolkatouch "$path"
        done
    fi
    for path in "$libdir/libtolkatouch.so.0" "$libdir/libtolkatouch.so" usr/include/tolkatouch/RecordingReplay.h \
                usr/include/tolkatouch/Gesture.h usr/include/tolkatouch/platform/HIDEvent.h \
                "$libdir/pkgconfig/tolkatouch.pc" "$libdir/cmake/TolkaTouch/TolkaTouchConfig.cmake" \
                usr/share/doc/libtolkatouch-dev/copyright \
                usr/share/doc/libtolkatouch-dev/examples/embedding/CMakeLists.txt \
                usr/share/doc/libtolkatouch-dev/examples/embedding/README.md; do
        has libtolkatouch-dev "$path"
    done
    # The unit starts the daemon the package holds; the configuration file is a conffile.
    make_scratch
    dpkg-deb -x "$(deb_of tolkatouch)" "$folder"
    grep -qx "ExecStart=/usr/sbin/tolkatouchd" "$folder/usr/lib/systemd/system/tolkatouchd.service" ||
        fail "the unit does not start /usr/sbin/tolkatouchd"
    dpkg-deb --ctrl-tarfile "$(deb_of tolkatouch)" | tar -xO ./conffiles | grep -x /etc/tolkatouch/log.conf >/dev/null ||
        fail "/etc/tolkatouch/log.conf is not a conffile"
    depends=$(dpkg-deb -f "$(deb_of tolkatouch)" Depends)
    for library in libudev1 libevdev2 libsystemd0; do
        [[ $depends == *"$library"* ]] || fail "tolkatouch does not depend on $library (dpkg-shlibdeps): $depends"
    done
    dpkg-deb --ctrl-tarfile "$(deb_of libtolkatouch-dev)" | tar -xO ./shlibs | grep "^libtolkatouch 0 " >/dev/null ||
        fail "libtolkatouch-dev has no shlibs entry for libtolkatouch.so.0"
    echo "contents: every file where the unit, the udev rule and the daemon expect it"
    ;;

extracted)
    make_scratch
    extract_all "$folder"
    tool=$folder/usr/bin/tolkatouch daemon=$folder/usr/sbin/tolkatouchd
    # Versions: the programs print "<version> (<revision>)", the packages and pkg-config the
    # Debian form of the same; all from one configuration.
    [ "$("$tool" --version)" = "$("$build/tools/tolkatouch" --version)" ] || fail "tolkatouch --version differs from the build's"
    [ "$("$daemon" --version)" = "$("$build/daemon/tolkatouchd" --version)" ] || fail "tolkatouchd --version differs"
    read -r _ program_version revision < <("$tool" --version)
    revision=${revision#(}; revision=${revision%)}
    expected=$program_version
    if [ -n "$revision" ] && [ "$revision" != "v$program_version" ]; then expected="$program_version+${revision//-/.}"; fi
    [ "$expected" = "$version" ] || fail "tolkatouch --version says $expected, the packages $version"
    modversion=$(PKG_CONFIG_PATH=$folder/usr/lib/$multiarch/pkgconfig pkg-config --modversion tolkatouch)
    [ "$modversion" = "$version" ] || fail "pkg-config --modversion tolkatouch says $modversion, the packages $version"
    # The tool replays a shipped example with the libraries of the unpacked tree.
    ldd "$tool" | grep "libtolkatouch-platform.so.0 => $folder/" >/dev/null || fail "tolkatouch does not load its own library"
    "$tool" replay --fast --json "$folder/usr/share/doc/tolkatouch/examples/everyday-session.json" >"$folder/replay.jsonl"
    expect_same "tolkatouch replay of the shipped example" "$source/tests/tools/expected/everyday-session.jsonl" "$folder/replay.jsonl"
    # The daemon finds the plug-in beside itself in the unpacked tree, not in /usr.
    [ ! -e "/usr/lib/$multiarch/tolkatouch/tolkatouch-hidservice.so" ] ||
        echo "note: a plug-in is installed in /usr too; the daemon's own is the one it must load"
    "$daemon" --simulate "$folder/usr/share/doc/tolkatouch/examples/reset-during-hold.json" --speed 50 --no-keys \
        --print --socket "$folder/tolkatouchd.sock" >"$folder/daemon.jsonl" 2>"$folder/daemon.log" ||
        { cat "$folder/daemon.log" >&2; fail "tolkatouchd --simulate did not run from the unpacked tree"; }
    [ "$(cut -d, -f1-4 "$folder/daemon.jsonl")" = "$(cut -d, -f1-4 "$source/tests/tools/expected/reset-during-hold.jsonl")" ] ||
        fail "tolkatouchd --simulate --print reported other events than tolkatouch replay"
    echo "extracted: versions agree ($version); tool and daemon run from $folder"
    ;;

embedding)
    need cmake cmake
    need pkg-config pkg-config
    make_scratch
    extract_all "$folder"
    example=$folder/usr/share/doc/libtolkatouch-dev/examples/embedding
    cmake -S "$example" -B "$folder/build" -G Ninja -DCMAKE_PREFIX_PATH="$folder/usr" >"$folder/configure.log" ||
        { cat "$folder/configure.log" >&2; fail "the embedding example does not configure against the unpacked libtolkatouch-dev"; }
    cmake --build "$folder/build" >"$folder/build.log" ||
        { cat "$folder/build.log" >&2; fail "the embedding example does not build"; }
    # The README's one-line build with pkg-config.
    export PKG_CONFIG_PATH=$folder/usr/lib/$multiarch/pkgconfig
    # shellcheck disable=SC2046
    g++ -std=c++20 "$example/replay-events.cpp" -o "$folder/replay-events-pc" $(pkg-config --cflags --libs tolkatouch) ||
        fail "the pkg-config build of the embedding example fails"
    for document in everyday-session reset-during-hold version0-session; do
        "$folder/usr/bin/tolkatouch" replay --fast --json "$source/examples/$document.json" >"$folder/$document.tool.jsonl"
        "$folder/build/replay-events" "$source/examples/$document.json" >"$folder/$document.cmake.jsonl"
        LD_LIBRARY_PATH=$folder/usr/lib/$multiarch "$folder/replay-events-pc" "$source/examples/$document.json" \
            >"$folder/$document.pc.jsonl"
        expect_same "replay-events (find_package) on $document" "$folder/$document.tool.jsonl" "$folder/$document.cmake.jsonl"
        expect_same "replay-events (pkg-config) on $document" "$folder/$document.tool.jsonl" "$folder/$document.pc.jsonl"
    done
    echo "embedding: the example prints what tolkatouch replay --fast --json prints"
    ;;

install)
    [ "$(id -u)" -eq 0 ] || { echo "skipped: installing packages needs root (CI runs as root)"; exit 77; }
    need apt-get apt
    for package in "${packages[@]}"; do
        if dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep "installed" >/dev/null; then
            echo "skipped: $package is installed on this machine already; it is left alone"
            exit 77
        fi
    done
    debs=()
    for package in "${packages[@]}"; do debs+=("$(deb_of "$package")"); done
    # Only where apt needs nothing else: what it would add from outside would stay after the purge.
    others=$(apt-get install -s "${debs[@]}" 2>/dev/null | awk '/^Inst /{print $2}' | grep -vxF -f <(printf '%s\n' "${packages[@]}") || true)
    if [ -n "$others" ]; then
        echo "skipped: apt would also install $(echo "$others" | tr '\n' ' ')- left out to keep the machine as it was"
        exit 77
    fi
    user_existed=no
    getent passwd tolkatouch >/dev/null && user_existed=yes
    make_scratch
    restore() {
        for package in "${packages[@]}"; do
            dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep "installed" >/dev/null && apt-get purge -y -q "$package" >/dev/null 2>&1
        done
        if [ "$user_existed" = no ]; then
            getent passwd tolkatouch >/dev/null && userdel tolkatouch
            getent group tolkatouch >/dev/null && groupdel tolkatouch
        fi
        rm -rf "$folder"
        return 0
    }
    trap restore EXIT
    snapshot() {
        find /etc /usr /var /opt /srv \( -path /var/log -o -path /var/cache -o -path /var/lib/apt \
             -o -path /var/lib/dpkg -o -path /var/tmp -o -path /var/backups \) -prune -o -print 2>/dev/null | sort
    }
    snapshot >"$folder/before"
    export DEBIAN_FRONTEND=noninteractive
    apt-get install -y -q "${debs[@]}" >"$folder/install.log" 2>&1 || { cat "$folder/install.log" >&2; fail "apt-get install failed"; }
    for package in "${packages[@]}"; do
        [ "$(dpkg-query -W -f='${Status}' "$package")" = "install ok installed" ] || fail "$package is not fully installed"
    done
    getent passwd tolkatouch >/dev/null || fail "the service user tolkatouch was not made"
    [ -L /etc/systemd/system/multi-user.target.wants/tolkatouchd.service ] || fail "the unit was not enabled"
    /usr/sbin/tolkatouchd --simulate /usr/share/doc/tolkatouch/examples/reset-during-hold.json --speed 50 --no-keys \
        --socket "$folder/tolkatouchd.sock" >/dev/null 2>&1 || fail "the installed tolkatouchd does not run"
    # Upgraded over itself: no error, nothing half-configured.
    apt-get install -y -q --reinstall "${debs[@]}" >"$folder/reinstall.log" 2>&1 ||
        { cat "$folder/reinstall.log" >&2; fail "installing the packages over themselves failed"; }
    for package in "${packages[@]}"; do
        [ "$(dpkg-query -W -f='${Status}' "$package")" = "install ok installed" ] || fail "$package is half-configured after reinstalling"
    done
    apt-get purge -y -q "${packages[@]}" >"$folder/purge.log" 2>&1 || { cat "$folder/purge.log" >&2; fail "apt-get purge failed"; }
    snapshot >"$folder/after"
    # Debian keeps the system user and the files its tools back up (/etc/passwd- and the like).
    left=$(comm -13 "$folder/before" "$folder/after" | grep -vxE '/etc/(passwd|group|shadow|gshadow)-?' || true)
    [ -z "$left" ] || fail "the purge left behind: $left"
    [ ! -e /run/tolkatouch ] || fail "/run/tolkatouch was left behind"
    echo "install: apt-get install, reinstall and purge of ${packages[*]} leave nothing behind"
    ;;

*)
    echo "usage: check-packages.sh build|lintian|contents|extracted|embedding|install BUILD_DIR SOURCE_DIR VERSION MULTIARCH" >&2
    exit 2
    ;;
esac
