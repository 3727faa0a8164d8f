#!/usr/bin/env bash
# Compares a clean of a recycle bin with "find BIN -type f -delete". Both meet the same tree: it is made
# once in the image of an ext4 file system, and each run mounts a fresh copy of that image. The runs
# come in pairs, one right after the other, because other work on the machine disturbs both alike.
# Prints a line per pair and the median ratio, of the time that passed and of the processor's time.
#
# There are two trees. In the first all files are of one size and were made folder by folder; in the
# second ("mixed") sizes and ages are random, the same in every run, so that the next file in the order
# of either mostly lies in another folder. BENCH_FILTER chooses kinds of clean by a regular expression.
#
# Usage, as root: recycle_bench.sh ORVARECYCLE [FILES [PAIRS [DIRECTORY]]]
#   ORVARECYCLE  the program
#   FILES        files in the bin (1000000), 1,000 a folder
#   PAIRS        pairs of runs per kind of clean (3)
#   DIRECTORY    where the images lie (TMPDIR or /tmp), the disk to be measured
set -euo pipefail

# A mount namespace of its own: whatever ends this script ends the mounts too.
[ -n "${RECYCLE_BENCH_INSIDE:-}" ] || RECYCLE_BENCH_INSIDE=1 exec unshare --mount "$0" "$@"

readonly PROGRAM=$(realpath "$1") FILES=${2:-1000000} PAIRS=${3:-3} PER_FOLDER=1000
readonly PLACE=$(realpath "$(mktemp -d "${4:-${TMPDIR:-/tmp}}/recycle_bench.XXXXXX")")
readonly ROOT=$PLACE/root
readonly BIN=$ROOT/volume1/bench/.recycle
trap 'cd /; umount -l "$ROOT/volume1" 2>/dev/null || true; rm -rf "$PLACE"' EXIT
export ORVA_ROOT=$ROOT

mkdir -p "$ROOT/usr/orva/etc" "$ROOT/volume1"
printf '{"shares":[{"name":"bench","path":"/volume1/bench","kind":1,"recycle_bin":true}]}' \
    >"$ROOT/usr/orva/etc/shares.json"

# Has the tree that the function `$1` makes in the image `full`.
made=
prepare() {
    [ "$made" != "$1" ] || return 0
    made=$1
    rm -f "$PLACE/full"
    truncate -s $((FILES * 600 + (256 << 20))) "$PLACE/full"
    mkfs.ext4 -q -F -N $((FILES + FILES / 10 + 10000)) "$PLACE/full"
    mount -o loop "$PLACE/full" "$ROOT/volume1"
    "$1"
    umount "$ROOT/volume1"
}

even() {
    local folder=0 left=$FILES count path
    while [ "$left" -gt 0 ]; do
        count=$((left < PER_FOLDER ? left : PER_FOLDER))
        path="$BIN/album$((folder / 100))/day$folder"
        mkdir -p "$path"
        (cd "$path" && seq -f 'holiday_picture_%06g.jpg' "$count" | xargs truncate -s 12345)
        folder=$((folder + 1)) left=$((left - count))
    done
}

mixed() {
    python3 - "$BIN" "$FILES" "$PER_FOLDER" <<'EOT'
import os, random, sys
bin, files, per_folder = sys.argv[1], int(sys.argv[2]), int(sys.argv[3])
chance = random.Random(1)
paths = []
for number in range(files):
    folder = number // per_folder
    path = f"{bin}/album{folder // 100}/day{folder}"
    if number % per_folder == 0:
        os.makedirs(path)
    paths.append(f"{path}/holiday_picture_{number % per_folder:06}.jpg")
    with open(paths[-1], "wb") as file:
        file.truncate(chance.randrange(1, 10**7))
chance.shuffle(paths)
for path in paths:
    os.chmod(path, 0o600)  # sets the change time, from which a clean tells the age
EOT
}

# Runs the arguments on a fresh copy of the tree; sets `seconds`, `cpu` (seconds), `megabytes` (the
# largest resident size) and `files` (how many are left).
measure() {
    cp --sparse=always "$PLACE/full" "$PLACE/copy"
    mount -o loop "$PLACE/copy" "$ROOT/volume1"
    read -r seconds cpu megabytes < <(python3 - "$@" <<'EOT'
import resource, subprocess, sys, time
start = time.monotonic()
subprocess.run(sys.argv[1:], check=True, stdout=subprocess.DEVNULL)
seconds = time.monotonic() - start
used = resource.getrusage(resource.RUSAGE_CHILDREN)
print(f"{seconds:.2f} {used.ru_utime + used.ru_stime:.2f} {used.ru_maxrss // 1024}")
EOT
    )
    files=$(find "$BIN" -type f | wc -l)
    umount "$ROOT/volume1"
}

divide() { awk -v a="$1" -v b="$2" 'BEGIN { printf "%.2f", a / (b > 0 ? b : 0.01) }'; }
median() { printf '%s\n' "$@" | sort -n | sed -n "$((($# + 1) / 2))p"; }

# compare TREE NAME RULE...
compare() {
    local tree=$1 name=$2 ratios=() cpuRatios=() pair findSeconds findCpu
    shift 2
    [[ $name =~ ${BENCH_FILTER:-.} ]] || return 0
    prepare "$tree"
    for ((pair = 1; pair <= PAIRS; ++pair)); do
        measure find "$BIN" -type f -delete
        findSeconds=$seconds findCpu=$cpu
        measure "$PROGRAM" --clean "$@"
        ratios+=("$(divide "$seconds" "$findSeconds")")
        cpuRatios+=("$(divide "$cpu" "$findCpu")")
        printf '%-26s find %6.2f s (cpu %6.2f)  orvarecycle %6.2f s (cpu %6.2f)  %4d MB  %d left\n' \
            "$name" "$findSeconds" "$findCpu" "$seconds" "$cpu" "$megabytes" "$files"
    done
    printf '%-26s median ratio %s (cpu %s)\n' "$name" "$(median "${ratios[@]}")" \
        "$(median "${cpuRatios[@]}")"
}

compare even 'everything'
compare even 'by age, with rules' -t 0 -file_ext='doc.pdf.xls' -m 104857600 -l 0
compare even 'to size 0, oldest first' -s 0 -o 1
compare even 'to size 0, largest first' -s 0 -o 2
compare mixed 'mixed, oldest first' -s 0 -o 1
compare mixed 'mixed, largest first' -s 0 -o 2
