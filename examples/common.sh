# Sourced by the run.sh of every example: the programs of the build, the
# example's own folder as the working folder, and the data files that every
# example makes from the text inputs of its make_inputs.py.
#   ./run.sh [folder of the built programs]   (default: build/release of the project)
here=$(cd "$(dirname "${BASH_SOURCE[1]}")" && pwd)
root=$(cd "$here/../.." && pwd)
bin=$(cd "${1:-$root/build/release}" && pwd)
bw=$bin/src/bw
bwdata=$bin/tools/bwdata/bwdata
bwplot=$root/tools/bwplot/bwplot
cd "$here"

# The text inputs, then the bathymetry and the sponge map as data files; the
# sponge map's values are factors, of unit 99000 (dimensionless):
#   make_maps "title of the bathymetry" "title of the sponge map"
make_maps() {
    /usr/bin/python3 make_inputs.py
    "$bwdata" import-asc bathymetry.asc -o bathymetry.xol2 --title "$1" >/dev/null
    "$bwdata" import-asc sponge.asc -o sponge.xol2 --name "Sponge" --type 999 --unit 99000 \
        --title "$2" >/dev/null
}

# Runs bw on a model file with its screen output kept in a file (the model's
# name with .out, or the second argument); when bw fails, shows the end of that
# output, where the reason is, and stops with bw's exit code.
#   run_bw model.bw [screen output file]
run_bw() {
    local out=${2:-${1%.bw}.out} status=0
    "$bw" "$1" >"$out" 2>&1 || status=$?
    if [ "$status" -ne 0 ]; then
        echo "bw $1 ended with exit code $status. The end of its screen output ($here/$out):" >&2
        tail -20 "$out" >&2
        exit "$status"
    fi
}
