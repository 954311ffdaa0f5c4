# shellcheck shell=bash
# What a build installs, in a directory of the test's own that goes with it. Sourced, with the build's
# directory as the first argument; gives `installed`, the directory, `prefix` in it, and `units`.

installed=$(mktemp -d)
trap 'rm -rf "$installed"' EXIT
DESTDIR=$installed cmake --install "$1" --prefix /usr/local >"$installed/log"
prefix=$installed/usr/local
units=$(dirname "$(find "$prefix" -name tovoelasticd.socket)")

# value UNIT KEY: the last value that the unit gives to the key.
value() { sed -n "s/^$2=//p" "$units/$1" | tail -n 1; }
