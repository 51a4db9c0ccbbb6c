#!/bin/bash
# Each installed manual page renders with `man -l`, and lists what its program's --help lists:
# every subcommand of tolkatouch (and of its subcommands that have their own), every long option
# of tolkatouchd. A subcommand added to the program and not to its page fails here.
#
#   check_man_pages.sh <man directory> <tolkatouch> <tolkatouchd>
set -euo pipefail
man_dir=${1:?usage: $0 <man directory> <tolkatouch> <tolkatouchd>}
tolkatouch=${2:?}
tolkatouchd=${3:?}
failures=0
fail() { echo "FAIL: $*" >&2; failures=$((failures + 1)); }

render() {
  local page=$1 text
  [ -f "$page" ] || { fail "$page is not installed"; return 1; }
  text=$(MANWIDTH=200 man -l "$page" 2> "$page.err") || { fail "man -l $page: $(cat "$page.err")"; return 1; }
  [ -s "$page.err" ] && fail "man -l $page warns: $(cat "$page.err")"
  rm -f "$page.err"
  printf '%s\n' "$text"
}

# The words under "Subcommands:" in a CLI --help.
subcommands_of() { "$@" --help | awk '/^Subcommands:/ { on = 1; next } on && /^  [a-z]/ { print $1 }'; }

commands=$(subcommands_of "$tolkatouch") && [ -n "$commands" ] || { echo "FAIL: $tolkatouch --help lists no subcommands" >&2; exit 1; }
tool_page=$(render "$man_dir/man1/tolkatouch.1") || true
for command in $commands; do
  # Each subcommand is a heading of its own: "   replay ..." at the start of a line.
  grep -Eq "^ +$command( |$)" <<< "$tool_page" || fail "tolkatouch(1) does not describe the subcommand \"$command\""
  for nested in $(subcommands_of "$tolkatouch" "$command"); do
    grep -Eq "$command $nested" <<< "$tool_page" || fail "tolkatouch(1) does not describe \"$command $nested\""
  done
done

options=$("$tolkatouchd" --help | grep -oE -- '--[a-z][a-z-]+' | sort -u) && [ -n "$options" ] \
  || { echo "FAIL: $tolkatouchd --help lists no options" >&2; exit 1; }
daemon_page=$(render "$man_dir/man8/tolkatouchd.8") || true
for option in $options; do
  grep -q -- "$option" <<< "$daemon_page" || fail "tolkatouchd(8) does not describe $option"
done

conf_page=$(render "$man_dir/man5/tolkatouch-log.conf.5") || true
grep -q "rate" <<< "$conf_page" || fail "tolkatouch-log.conf(5) does not describe the rate guard"

if [ "$failures" -gt 0 ]; then exit 1; fi
echo "manual pages: every subcommand and option described"
