# Shared by the scripts beside it, which source it from the repository's root.
# shellcheck shell=bash

# configure_and_build PRESET [TARGET]: quietly, with a log under build/. Warnings are errors in each of the scripts, so
# that none of them builds again what another has built. What differs from a preset, which sets its variables anew each
# time, stands in configure_options.
configure_options=()
configure_and_build() {
    local -r preset=$1 log=build/$1.log
    mkdir -p build
    local -r began=$SECONDS
    echo "${0##*/}: building $preset"
    if {
        cmake --preset "$preset" -DQORI_WERROR=ON "${configure_options[@]}" &&
            cmake --build --preset "$preset" -j"$(nproc)" ${2:+--target "$2"}
    } >"$log" 2>&1; then
        echo "${0##*/}: built $preset in $((SECONDS - began)) s"
        return
    fi
    { grep -m 20 -E 'error|Error|FAILED' "$log" || tail -n 20 "$log"; } >&2
    echo "${0##*/}: building $preset failed; the whole report is in $log" >&2
    exit 1
}

# Makes Wine's prefix once, so that programs, and tests that run side by side, find it ready: one for programs of both
# widths. A prefix that was not finished has no registry file; one of 32-bit Wine alone runs no 64-bit programs.
start_wine() {
    local -r own=$PWD/build/wine
    export WINEPREFIX="${WINEPREFIX:-$own}" WINEDEBUG=-all WINEDLLOVERRIDES="mscoree,mshtml="
    if grep -qs '^#arch=win32' "$WINEPREFIX/system.reg"; then
        if [[ $WINEPREFIX != "$own" ]]; then
            echo "${0##*/}: WINEPREFIX=$WINEPREFIX runs 32-bit programs only; name another folder, or none" >&2
            exit 1
        fi
        rm -rf "$own"
    fi
    if [[ ! -f $WINEPREFIX/system.reg ]]; then
        mkdir -p "$(dirname "$WINEPREFIX")"
        echo "${0##*/}: first start of Wine"
        if ! { wineboot -i && wineserver -w; } >/dev/null 2>&1; then
            echo "${0##*/}: Wine does not start (Debian packages wine, wine64, wine32:i386)" >&2
            exit 1
        fi
    fi
    # Without wine32 a 32-bit program does nothing and ends with status 0, as if its tests had passed.
    local folder status
    for folder in system32 syswow64; do
        status=0
        wine "C:\\windows\\$folder\\cmd.exe" /c exit 7 >/dev/null 2>&1 || status=$?
        if [[ $status -ne 7 ]]; then
            echo "${0##*/}: Wine does not run programs of both widths; scripts/setup windows installs what is missing." \
                "If nothing is, remove $WINEPREFIX" >&2
            exit 1
        fi
    done
}

# Keeps Wine's own processes running until stop_wine. A test that started them would hand them its output, and whoever
# reads that would wait for their end: the first test of a run seemed to last as long as all the others.
hold_wine() {
    local -r held=$WINEPREFIX/held
    [[ -p $held ]] || mkfifo "$held"
    exec {wine_input}<>"$held"
    wine cmd <&"$wine_input" >/dev/null 2>&1 &
    # It is up when it has answered once.
    wine cmd /c exit >/dev/null 2>&1
}

stop_wine() { wineserver -k || true; }
