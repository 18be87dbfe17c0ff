#!/bin/sh
# Installs the build into a temporary prefix and checks that every file a
# package needs lands where desktops, man and the program itself look.
# Usage: check-install-tree.sh CMAKE BUILD_DIR
set -u

cmake=$1
build=$2
prefix=$(mktemp -d "${TMPDIR:-/tmp}/velloca-install.XXXXXX") || exit 1
trap 'rm -rf "$prefix"' EXIT

failures=0
fail() {
    echo "FAIL: $*" >&2
    failures=$((failures + 1))
}

if ! "$cmake" --install "$build" --prefix "$prefix" >"$prefix.log" 2>&1; then
    cat "$prefix.log" >&2
    rm -f "$prefix.log"
    echo "FAIL: cmake --install $build --prefix $prefix failed" >&2
    exit 1
fi
rm -f "$prefix.log"

for program in velloca velloca-desktop vellocactl; do
    [ -x "$prefix/bin/$program" ] || fail "bin/$program is missing or not executable"
done
for file in share/doc/velloca/manual.html share/doc/velloca/README.md \
            share/man/man1/velloca.1 share/man/man1/vellocactl.1 \
            share/applications/velloca.desktop \
            share/icons/hicolor/scalable/apps/velloca.svg; do
    [ -s "$prefix/$file" ] || fail "$file is missing or empty"
done

# Help looks for the manual relative to the program.
[ -f "$prefix/bin/../share/doc/velloca/manual.html" ] \
    || fail "the manual is not at ../share/doc/velloca/manual.html from bin"

desktop=$prefix/share/applications/velloca.desktop
if [ -f "$desktop" ]; then
    grep -qx 'Exec=velloca' "$desktop" || fail "velloca.desktop does not start velloca"
    grep -qx 'Icon=velloca' "$desktop" || fail "velloca.desktop does not name the installed icon"
    if command -v desktop-file-validate >/dev/null 2>&1; then
        desktop-file-validate "$desktop" || fail "velloca.desktop does not validate"
    fi
fi

for page in velloca vellocactl; do
    file=$prefix/share/man/man1/$page.1
    [ -f "$file" ] && ! grep -q '^\.SH NAME' "$file" && fail "$page.1 has no NAME section"
done

grep -q '<svg' "$prefix/share/icons/hicolor/scalable/apps/velloca.svg" 2>/dev/null \
    || fail "velloca.svg is not an SVG image"

# The installed client runs on its own: with nobody listening it must say
# "unreachable" (2), not crash for want of a library or plugin.
if [ -x "$prefix/bin/vellocactl" ]; then
    "$prefix/bin/vellocactl" --socket "$prefix/no-such-socket" System '[APPEXIT]' 2>/dev/null
    status=$?
    [ "$status" -eq 2 ] || fail "installed vellocactl exited $status for an unreachable channel, expected 2"
fi

if [ "$failures" -ne 0 ]; then
    echo "$failures problem(s) in the installed tree" >&2
    exit 1
fi
echo "install tree complete"
