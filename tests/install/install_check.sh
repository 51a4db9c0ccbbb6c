#!/bin/bash
# `cmake --install` of a build into a temporary root (DESTDIR) puts every file where the packaged
# unit and udev rule, and the programs themselves, look for it; the installed daemon starts from
# there with --simulate and finds its plug-in and log configuration without being told; the
# manual pages render and describe every subcommand (check_man_pages.sh).
#
#   install_check.sh <build directory> <example document>
set -euo pipefail
build=${1:?usage: $0 <build directory> <example document>}
document=${2:?usage: $0 <build directory> <example document>}
root=$(mktemp -d)
trap 'rm -rf "$root"' EXIT
failures=0
fail() { echo "FAIL: $*" >&2; failures=$((failures + 1)); }

DESTDIR=$root cmake --install "$build" > "$root.install.log" 2>&1 || { cat "$root.install.log" >&2; exit 1; }
rm -f "$root.install.log"
prefix=$(sed -n 's/^CMAKE_INSTALL_PREFIX:PATH=//p' "$build/CMakeCache.txt")
base=$root$prefix
# The configured sysconfdir: /etc for /usr, <prefix>/etc otherwise.
if [ "$prefix" = /usr ]; then etc=$root/etc; else etc=$base/etc; fi

unit=$base/lib/systemd/system/tolkatouchd.service
[ -f "$unit" ] || fail "the unit is not at lib/systemd/system/tolkatouchd.service"
exec_start=$(sed -n 's/^ExecStart=//p' "$unit" | cut -d' ' -f1)
[ -x "$root$exec_start" ] || fail "the unit starts $exec_start, which is not installed there"

for file in lib/udev/rules.d/70-tolkatouch.rules lib/sysusers.d/tolkatouch.conf lib/modules-load.d/tolkatouch.conf \
            share/bash-completion/completions/tolkatouch share/bash-completion/completions/tolkatouchd \
            share/zsh/vendor-completions/_tolkatouch; do
  [ -f "$base/$file" ] || fail "$file is not installed"
done
[ -x "$base/bin/tolkatouch" ] || fail "bin/tolkatouch is not installed"
[ -f "$etc/tolkatouch/log.conf" ] || fail "the log configuration is not at ${etc#$root}/tolkatouch/log.conf"
plugin=$(find "$base" -name tolkatouch-hidservice.so | head -1)
[ -n "$plugin" ] || fail "the plug-in is not installed"
[ "$(dirname "$plugin")" = "$base/lib/tolkatouch" ] || [ "$(dirname "$plugin")" = "$(dirname "$(dirname "$plugin")")/tolkatouch" ] \
  || fail "the plug-in is at ${plugin#$root}"

# The completion files load in their shells.
bash -c "source /usr/share/bash-completion/bash_completion 2>/dev/null; source '$base/share/bash-completion/completions/tolkatouch'; complete -p tolkatouch" > /dev/null \
  || fail "the bash completion does not load"
zsh -n "$base/share/zsh/vendor-completions/_tolkatouch" || fail "the zsh completion does not parse"

# The installed programs, with the library directory of the temporary root (the real prefix's is
# in their run path): the daemon finds its plug-in beside itself and plays the document.
export LD_LIBRARY_PATH=$base/lib
daemon=$root$exec_start
socket=$root/tolkatouchd.sock
if ! out=$("$daemon" --simulate "$document" --speed 50 --no-keys --print \
      --socket "$socket" --log-config "$etc/tolkatouch/log.conf" 2> "$root/daemon.err"); then
  fail "the installed daemon did not run: $(head -3 "$root/daemon.err")"
fi
[ "$(grep -c '"event"' <<< "$out" || true)" -gt 0 ] || fail "the installed daemon printed no events"
"$daemon" --version > /dev/null || fail "the installed daemon does not answer --version"
"$base/bin/tolkatouch" --version > /dev/null || fail "the installed tool does not answer --version"

bash "$(dirname "$0")/check_man_pages.sh" "$base/share/man" "$base/bin/tolkatouch" "$daemon" \
  || failures=$((failures + 1))

if [ "$failures" -gt 0 ]; then exit 1; fi
echo "install check: every file in place; the installed daemon ran"
