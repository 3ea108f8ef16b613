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

# The text inputs, then the bathymetry and the sponge map as data files:
#   make_maps "title of the bathymetry" "title of the sponge map"
make_maps() {
    /usr/bin/python3 make_inputs.py
    "$bwdata" import-asc bathymetry.asc -o bathymetry.xol2 --title "$1" >/dev/null
    "$bwdata" import-asc sponge.asc -o sponge.xol2 --name "Sponge" --type 999 --unit 1000 \
        --title "$2" >/dev/null
}
