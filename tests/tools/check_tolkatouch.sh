#!/bin/bash
# Runs one tolkatouch command and checks what it did:
#   check_tolkatouch.sh [--exit N] [--stdout FILE | --stdout-empty] [--stderr-text TEXT | --stderr-empty]
#                       [--stderr-contains TEXT] [--stdout-contains TEXT] [--stdin FILE] -- COMMAND [ARGUMENTS...]
# --stdout FILE compares standard output with FILE byte for byte; --stderr-text compares standard
# error with TEXT and one line end. The exit status defaults to 0. On a difference it prints the
# diff and fails.
set -u

expected_exit=0
expected_stdout=
stdout_empty=0
stderr_text=
stderr_text_given=0
stderr_empty=0
stderr_contains=
stdout_contains=
stdin_file=/dev/null

while [ $# -gt 0 ]; do
  case "$1" in
    --exit) expected_exit=$2; shift 2 ;;
    --stdout) expected_stdout=$2; shift 2 ;;
    --stdout-empty) stdout_empty=1; shift ;;
    --stderr-text) stderr_text=$2; stderr_text_given=1; shift 2 ;;
    --stderr-empty) stderr_empty=1; shift ;;
    --stderr-contains) stderr_contains=$2; shift 2 ;;
    --stdout-contains) stdout_contains=$2; shift 2 ;;
    --stdin) stdin_file=$2; shift 2 ;;
    --) shift; break ;;
    *) echo "check_tolkatouch.sh: unknown option $1" >&2; exit 2 ;;
  esac
done

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

"$@" <"$stdin_file" >"$work/stdout" 2>"$work/stderr"
status=$?
failed=0

if [ "$status" != "$expected_exit" ]; then
  echo "exit status $status, expected $expected_exit"
  failed=1
fi
if [ -n "$expected_stdout" ] && ! cmp -s "$expected_stdout" "$work/stdout"; then
  echo "standard output differs from $expected_stdout:"
  diff -u "$expected_stdout" "$work/stdout" | head -40
  failed=1
fi
if [ "$stdout_empty" = 1 ] && [ -s "$work/stdout" ]; then
  echo "standard output is not empty:"
  head -20 "$work/stdout"
  failed=1
fi
if [ "$stderr_text_given" = 1 ]; then
  printf '%s\n' "$stderr_text" >"$work/expected-stderr"
  if ! cmp -s "$work/expected-stderr" "$work/stderr"; then
    echo "standard error differs:"
    diff -u "$work/expected-stderr" "$work/stderr" | head -40
    failed=1
  fi
fi
if [ "$stderr_empty" = 1 ] && [ -s "$work/stderr" ]; then
  echo "standard error is not empty:"
  head -20 "$work/stderr"
  failed=1
fi
# require_text NAME TEXT FILE: FILE must hold TEXT when TEXT is given.
require_text() {
  if [ -n "$2" ] && ! grep -qF -- "$2" "$3"; then
    echo "$1 lacks '$2':"
    head -20 "$3"
    failed=1
  fi
}
require_text "standard error" "$stderr_contains" "$work/stderr"
require_text "standard output" "$stdout_contains" "$work/stdout"
exit $failed
