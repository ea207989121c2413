#!/usr/bin/env bash
# End to end: mkdvrfs writes disks, every dvrfs command reads them; output and
# exit statuses compared exactly.
#   dvrfs_cli_test.sh MKDVRFS DVRFS CLIP
set -u
mkdvrfs=$1
dvrfs=$2
clip=$3
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
# With MORVANE_KEEP_DISKS naming a folder, a copy of each disk written here
# stays there under its own name (name-2.img, ... when a name is written
# again), for the golden answers.
if [ -n "${MORVANE_KEEP_DISKS:-}" ]; then
  cat >"$work/mkdvrfs-kept" <<KEEP
#!/usr/bin/env bash
"$mkdvrfs" "\$@"; status=\$?
out=\${*: -1}
if [ \$status -eq 0 ] && [ -f "\$out" ]; then
  name=\$(basename "\$out" .img)
  kept="$MORVANE_KEEP_DISKS/cli-\$name.img"
  for k in \$(seq 2 99); do [ -e "\$kept" ] || break; kept="$MORVANE_KEEP_DISKS/cli-\$name-\$k.img"; done
  cp --sparse=always "\$out" "\$kept"
fi
exit \$status
KEEP
  chmod +x "$work/mkdvrfs-kept"
  mkdvrfs=$work/mkdvrfs-kept
fi
failures=0
checks=0

check() {  # check NAME EXPECTED ACTUAL
  checks=$((checks + 1))
  if [ "$2" != "$3" ]; then
    echo "FAIL: $1"
    diff <(printf '%s\n' "$2") <(printf '%s\n' "$3")
    failures=$((failures + 1))
  fi
}

# --- mkdvrfs
"$mkdvrfs" --help | grep -q '^Usage: mkdvrfs'
check "mkdvrfs --help" 0 $?
"$mkdvrfs" --no-such-option "$work/x.img" 2>/dev/null
check "mkdvrfs usage error" 2 $?
"$mkdvrfs" --damage list "$work/x.img" 2>/dev/null
check "mkdvrfs damage without index" 2 $?
"$mkdvrfs" --list-span 0 "$work/x.img" 2>/dev/null
check "mkdvrfs --list-span takes FIRST:LAST" 2 $?
"$mkdvrfs" --recording 0:0:0:100:200 --mirror-at 2097152 --data-ring-at 4194304 "$work/placed.img" >/dev/null
check "mkdvrfs places the list mirror and the data ring" "	List: Offset=491520, OffsetBackup=2097152, Max=64
	DataBlock: Offset=4194304, Max=8" "$("$dvrfs" info "$work/placed.img" --dump | grep -E '^.(List|DataBlock):')"

# --- info
"$mkdvrfs" --adapter-run 110:15 \
  --recording 0:0:2:1700000000:1700000600 \
  --recording 1:6:1:1700000700:1700001500 --damage list:0 "$work/disk.img" >/dev/null
out=$("$dvrfs" info "$work/disk.img" --dump)
check "info exit status" 0 $?
check "info output" "magic=0x1234
header_size=252
block_size=4096
block_count=32892
block_table_count=4
offset_block_space=1048576
super_offset=0
super_offset_backup=524288
image=raw
superblock_copy=primary
adapter_slot=4
adapter_version=1
list_max=64
data_block_max=8
first_list=0
last_list=1
record_sum=90
start_time=1700000000
end_time=1700001500
info_1=0
info_3=0
info_17=1
info_19=10
info_33=64
info_35=8
info_49=12
info_50=1014
	Adapter: Version=1, TimeStamp=1014, Idx=4, Magic=0x48444152
	List: Offset=491520, OffsetBackup=499712, Max=64
	DataBlock: Offset=507904, Max=8
	StartTime=22:13:20(1700000000), EndTime=22:38:20(1700001500)" "$out"

"$mkdvrfs" --damage primary-super "$work/primary.img" >/dev/null
out=$("$dvrfs" info "$work/primary.img" | grep copy)
check "info on a damaged primary superblock reads the backup" "superblock_copy=backup" "$out"
"$mkdvrfs" --damage primary-super --damage backup-super "$work/bad.img" >/dev/null
err=$("$dvrfs" info "$work/bad.img" 2>&1 >/dev/null)
check "info on two damaged superblocks" 1 $?
check "info says why" "dvrfs: $work/bad.img: not a recorder disk (both superblocks damaged) (reader's code 33)" "$err"
out=$("$dvrfs" info --json "$work/disk.img" | grep -o '"superblock_copy": "primary".*"end_time_utc": "2023-11-14T22:38:20Z"}')
check "info --json: the same facts, the times also in ISO 8601" 0 $?
"$mkdvrfs" --version 0 "$work/blank.img" >/dev/null
err=$("$dvrfs" info "$work/blank.img" 2>&1 >/dev/null)
check "info on an unconfigured disk" 1 $?
check "info on an unconfigured disk says so" \
  "dvrfs: $work/blank.img: no recorder was ever configured on this disk" "$err"
"$dvrfs" info >/dev/null 2>&1
check "usage error" 2 $?
"$dvrfs" --help | grep -q '^Usage: dvrfs'
check "dvrfs --help" 0 $?

# --- list: a list span that wraps the list ring of 64, one entry repaired
"$mkdvrfs" --recording 62:0:0:0:86399 --recording 63:1:1:1700000000:1700003723 \
  --recording 0:2:3:951782400:951868799 --damage list:63 "$work/list.img" >/dev/null
out=$("$dvrfs" list "$work/list.img")
check "list exit status" 0 $?
check "list output" "$(printf '0\t62\t0\t86399\t1970/01/01 00:00:00-23:59:59
1\t63\t1700000000\t1700003723\t2023/11/14 22:13:20-23:15:23
2\t0\t951782400\t951868799\t2000/02/29 00:00:00-23:59:59')" "$out"
out=$("$dvrfs" list "$work/list.img" --json)
check "list --json" '{"span_count": 3, "recordings": [{"row": 0, "idx": 62, "start": 0, "end": 86399, "date": "1970/01/01", "time": "00:00:00-23:59:59", "start_utc": "1970-01-01T00:00:00Z", "end_utc": "1970-01-01T23:59:59Z"}, {"row": 1, "idx": 63, "start": 1700000000, "end": 1700003723, "date": "2023/11/14", "time": "22:13:20-23:15:23", "start_utc": "2023-11-14T22:13:20Z", "end_utc": "2023-11-14T23:15:23Z"}, {"row": 2, "idx": 0, "start": 951782400, "end": 951868799, "date": "2000/02/29", "time": "00:00:00-23:59:59", "start_utc": "2000-02-29T00:00:00Z", "end_utc": "2000-02-29T23:59:59Z"}], "skipped": [], "error": {"code": 50, "text": "FUNCTION[1463]"}}' "$out"
"$mkdvrfs" --recording 5:0:0:100:200 "$work/one.img" >/dev/null
out=$("$dvrfs" list "$work/one.img" --json)
check "list --json of an untroubled disk" '{"span_count": 1, "recordings": [{"row": 0, "idx": 5, "start": 100, "end": 200, "date": "1970/01/01", "time": "00:01:40-00:03:20", "start_utc": "1970-01-01T00:01:40Z", "end_utc": "1970-01-01T00:03:20Z"}], "skipped": [], "error": null}' "$out"
"$mkdvrfs" --recording 0:0:0:100:200 --recording 1:1:1:300:400 --recording 2:2:2:500:600 \
  --damage list:1 --damage mirror:1 "$work/cut.img" >/dev/null
out=$("$dvrfs" list "$work/cut.img" 2>"$work/skipped")
check "list passes over an entry damaged in both copies" "$(printf '0\t0\t100\t200\t1970/01/01 00:01:40-00:03:20
1\t2\t500\t600\t1970/01/01 00:08:20-00:10:00')" "$out"
check "list names the entry it passed over" \
  "dvrfs: 1 damaged recording entry skipped (list position 1)" "$(cat "$work/skipped")"
out=$("$dvrfs" list "$work/cut.img" --json 2>/dev/null | grep -o '"skipped": \[[0-9, ]*\]')
check "list --json names it too" '"skipped": [1]' "$out"
"$dvrfs" list "$work/bad.img" >/dev/null 2>&1
check "list of a damaged superblock" 1 $?
"$mkdvrfs" --adapter-run 5:0 "$work/noadapter.img" >/dev/null
err=$("$dvrfs" list "$work/noadapter.img" 2>&1)
check "list without an adapter" 1 $?
check "list without an adapter says so" \
  "dvrfs: $work/noadapter.img: no valid state record of the recorder found (reader's code 36: FUNCTION[1141])" "$err"

# --- verify
out=$("$dvrfs" verify "$work/one.img")
check "verify of a sound disk" 0 $?
check "verify of a sound disk says so" "summary: 130 records checked, 0 damaged, 0 repaired" "$out"
"$mkdvrfs" --adapter-run 0:3 --recording 0:0:1:100:200 --recording 1:2:3:300:400 \
  --damage backup-super --damage adapter:1 --damage list:0 --damage mirror:1 \
  --damage header:2 --damage index:1:2 "$work/damaged.img" >/dev/null
out=$("$dvrfs" verify "$work/disk.img")
check "verify of a disk whose newest recording wraps the data ring" "repaired: list entry 0 (ring copy damaged, mirror copy used)
summary: 148 records checked, 0 damaged, 1 repaired" "$out"
out=$("$dvrfs" verify "$work/damaged.img")
check "verify of a damaged disk" 3 $?
check "verify reports each damaged record" "damaged: backup superblock
damaged: adapter slot 1
repaired: list entry 0 (ring copy damaged, mirror copy used)
damaged: list entry 1 (mirror copy)
damaged: data block 1 index entry 2
damaged: data block 2 header
summary: 140 records checked, 5 damaged, 1 repaired" "$out"
out=$("$dvrfs" verify --json "$work/damaged.img")
check "verify --json" '{"stage": "complete", "checked": 140, "damaged": 5, "repaired": 1, "findings": [{"kind": "damaged", "record": "backup superblock"}, {"kind": "damaged", "record": "adapter slot 1"}, {"kind": "repaired", "record": "list entry 0 (ring copy damaged, mirror copy used)"}, {"kind": "damaged", "record": "list entry 1 (mirror copy)"}, {"kind": "damaged", "record": "data block 1 index entry 2"}, {"kind": "damaged", "record": "data block 2 header"}]}' "$out"
"$mkdvrfs" --damage backup-table "$work/table.img" >/dev/null
out=$("$dvrfs" verify "$work/table.img")
check "verify of a damaged backup table" 3 $?
check "verify reports the backup table" "damaged: backup block table
summary: 124 records checked, 1 damaged, 0 repaired" "$out"
out=$("$dvrfs" verify "$work/primary.img")
check "verify of a damaged primary superblock goes on" 3 $?
check "verify reports the primary superblock and the backup in use" "damaged: primary superblock
summary: 123 records checked, 1 damaged, 0 repaired" "$out"
out=$("$dvrfs" verify "$work/bad.img" 2>/dev/null)
check "verify of two damaged superblocks" 1 $?
check "verify reports both superblocks" "damaged: primary superblock
damaged: backup superblock
summary: 2 records checked, 2 damaged, 0 repaired" "$out"

# --- extract: frames from a file, across the end of the data ring
for i in $(seq 1 300); do printf 'frame-%04d-' "$i"; done > "$work/frames.bin"
"$mkdvrfs" --frames "$work/frames.bin" --frame-size 1100 \
  --recording 0:2:3:100:200:3 --recording 1:7:0:300:400:2 --damage index:2:1 "$work/play.img" >/dev/null
frame() { head -c $((1100 * $1)) "$work/frames.bin" | tail -c 1100; }
out=$("$dvrfs" extract "$work/play.img" 1 -o "$work/wrapped.es")
check "extract exit status" 0 $?
check "extract says what it wrote" "4 frames, 4400 bytes written to $work/wrapped.es" "$out"
check "extract writes the frames in order across the end of the ring" \
  "$( (frame 1; frame 2; frame 3; frame 1) | od -c)" "$(od -c < "$work/wrapped.es")"
"$dvrfs" extract "$work/play.img" 1 -o "$work/wrapped.es" 2>/dev/null
check "extract refuses to replace a file" 2 $?
out=$("$dvrfs" extract "$work/play.img" 0 -o "$work/wrapped.es" --force 2>"$work/warning")
check "extract --force replaces it" "5 frames, 5500 bytes written to $work/wrapped.es" "$out"
check "extract warns of the damaged frame it left out" \
  "dvrfs: warning: 1 damaged frame(s) and 0 damaged block(s) left out" "$(cat "$work/warning")"
check "extract leaves out only the damaged frame" \
  "$( (frame 1; frame 3; frame 1; frame 2; frame 3) | od -c)" "$(od -c < "$work/wrapped.es")"
"$dvrfs" extract "$work/play.img" 2 -o "$work/none.es" 2>/dev/null
check "extract of a row that is not there" 2 $?
before=$(cksum < "$work/play.img")
"$dvrfs" extract "$work/play.img" 0 -o "$work/play.img" --force 2>/dev/null
check "extract refuses to write into the disk" 2 $?
check "the disk is untouched" "$before" "$(cksum < "$work/play.img")"
"$dvrfs" extract "$work/play.img" x -o "$work/x.es" 2>/dev/null
check "extract of a row that is no number" 2 $?
test ! -e "$work/none.es" && test ! -e "$work/x.es"
check "refused extracts write nothing" 0 $?

# --- the command line
"$dvrfs" --version | grep -q '^dvrfs '
check "dvrfs --version" 0 $?
for command in info list verify extract export hash; do
  "$dvrfs" "$command" --help | grep -q "^Usage: dvrfs $command"
  check "dvrfs $command --help" 0 $?
done
err=$("$dvrfs" lsit "$work/one.img" 2>&1)
check "an unknown command is named" "dvrfs: no command 'lsit'
Try 'dvrfs --help'." "$err"
check "options before the disk" "$("$dvrfs" list "$work/one.img" --json)" "$("$dvrfs" list --json "$work/one.img")"
# Failures in plain words, the register's code after them.
head -c 65536 /dev/urandom > "$work/random.img"
: > "$work/empty.img"
cp --sparse=always "$work/one.img" "$work/cut.img" && truncate -s 600000 "$work/cut.img"
for case in "missing.img:cannot open: No such file or directory" ":cannot read: Is a directory" \
    "empty.img:not a recorder disk (the image is empty)" \
    "random.img:not a recorder disk: no superblock at the start (reader's code 33: FUNCTION[9" \
    "cut.img:the image is 600 KB but the disk it holds is"; do
  err=$("$dvrfs" list "$work/${case%%:*}" 2>&1)
  check "list of ${case%%:*} exits 1" 1 $?
  case "$err" in *"${case#*:}"*) ;; *) check "list of ${case%%:*} says: ${case#*:}" "${case#*:}" "$err" ;; esac
done
check "a folder is no disk, and no register was asked" "dvrfs: $work/: cannot read: Is a directory" \
  "$("$dvrfs" list "$work/" 2>&1)"
for case in "primary-table:backup-super:primary block table and backup superblock" \
    "primary-super:backup-table:primary superblock and backup block table"; do
  IFS=: read -r first second words <<<"$case"
  "$mkdvrfs" --recording 0:0:0:100:200 --damage "$first" --damage "$second" "$work/mixed.img" >/dev/null
  err=$("$dvrfs" list "$work/mixed.img" 2>&1)
  case "$err" in *"not a recorder disk ($words damaged)"*) ;; *) check "$first and $second in their own words" "$words" "$err" ;; esac
done

# A recorder that recorded nothing: its newest position is still negative,
# and the span it names holds no entry, so nothing is damaged.
"$mkdvrfs" --list-span 0:-1 "$work/unrecorded.img" >/dev/null
check "list of a recorder that recorded nothing" "" "$("$dvrfs" list "$work/unrecorded.img" 2>&1)"
check "its JSON: no span, no recording, nothing skipped" \
  '{"span_count": 0, "recordings": [], "skipped": [], "error": {"code": 50, "text": "FUNCTION[1463]"}}' \
  "$("$dvrfs" list --json "$work/unrecorded.img")"
out=$("$dvrfs" verify "$work/unrecorded.img")
check "verify of it exits 0" 0 $?
check "verify of it finds no damage" "summary: 252 records checked, 0 damaged, 0 repaired" "$out"

# A name that is not UTF-8, as copied from an older system: every command
# opens it, and prints it with the byte escaped.
odd=$work/$'odd\xffname.img'
"$mkdvrfs" --h264 "$clip" --recording 0:0:1:1700000000:1700000002:25 "$work/even.img" >/dev/null
cp --sparse=always "$work/even.img" "$odd"
check "list of a name that is not UTF-8" "$("$dvrfs" list "$work/even.img")" "$("$dvrfs" list "$odd")"
check "info of it" "$("$dvrfs" info "$work/even.img")" "$("$dvrfs" info "$odd")"
check "verify of it" "$("$dvrfs" verify "$work/even.img")" "$("$dvrfs" verify "$odd")"
mkdir "$work/odd-out"
"$dvrfs" export "$odd" 0 -o "$work/odd-out" >/dev/null
check "export of it" 0 $?
"$dvrfs" report "$odd" -o "$work/odd-out" >/dev/null
check "report of it" 0 $?
grep -qF '"disk": "'"$work"'/odd\\xffname.img"' "$work/odd-out/report.json"
check "the report names it escaped" 0 $?
# A real block device: a disk image attached read-only as a loop device reads
# as the image does, and the device's size is its own (a cut one is named).
if [ "$(id -u)" -eq 0 ] && dev=$(losetup -r -f --show "$work/even.img" 2>/dev/null); then
  check "list of the device is the list of the image" "$("$dvrfs" list "$work/even.img")" "$("$dvrfs" list "$dev")"
  check "verify of the device is the verify of the image" "$("$dvrfs" verify "$work/even.img")" \
    "$("$dvrfs" verify "$dev")"
  check "info names the device" "image=raw device" "$("$dvrfs" info "$dev" | grep '^image=')"
  losetup -d "$dev"
  if dev=$(losetup -r -f --show "$work/cut.img" 2>/dev/null); then
    err=$("$dvrfs" list "$dev" 2>&1)
    case "$err" in *"the image is 600 KB but the disk it holds is 136 MB: truncated?"*) ;;
      *) check "a cut device is named" "truncated?" "$err" ;; esac
    losetup -d "$dev"
  fi
else
  echo "no loop device here: the block device checks are left out"
fi
check "a failure names it escaped" "dvrfs: $work/gone\xff.img: cannot open: No such file or directory" \
  "$("$dvrfs" list "$work/"$'gone\xff.img' 2>&1)"

# --- export: the sample clip's frames, 25 a second, a key frame a second
"$mkdvrfs" --h264 "$clip" --recording 0:0:1:1700000000:1700000002:25 \
  --recording 1:2:4:1700003600:1700003603:25 --damage header:3 "$work/clip.img" >/dev/null
mkdir "$work/out"
out=$("$dvrfs" export "$work/clip.img" 0 -o "$work/out")
check "export of a sound recording" 0 $?
check "export says what it wrote and its digest" "$work/out/row0-20231114T221320Z.mp4: row 0, 50 frames, 2.0 s from 2023-11-14T22:13:20Z, 25 frames/s (the stream's timing)
sha256 $(sha256sum < "$work/out/row0-20231114T221320Z.mp4" | cut -c1-64)  $work/out/row0-20231114T221320Z.mp4" "$out"
(cd "$work/out" && sha256sum -c --quiet row0-20231114T221320Z.mp4.sha256)
check "the .sha256 file checks" 0 $?
err=$("$dvrfs" export "$work/clip.img" 1 -o "$work/out/one.mkv" --format mkv 2>&1 >/dev/null)
check "export that left a damaged block out" 4 $?
check "export names the block it left out, with its time" \
  "dvrfs: warning: row 1: data block 3 left out (header damaged), after 2023-11-14T23:13:21Z" "$err"
"$dvrfs" export "$work/clip.img" 0 -o "$work/out/row0-20231114T221320Z.mp4" 2>/dev/null
check "export refuses to replace a file" 2 $?
"$dvrfs" export "$work/clip.img" 0 -o "$work/no/such/folder.mp4" 2>/dev/null
check "export that cannot write its output" 5 $?
"$dvrfs" export "$work/clip.img" 0 -o - 2>/dev/null | cat >"$work/piped.mp4"
check "export -o - writes an MP4 to standard output" ftyp "$(head -c 8 "$work/piped.mp4" | tail -c 4)"
out=$("$dvrfs" export "$work/clip.img" --from 1700000001 --to 2023-11-14T23:13:21Z -o "$work/range/" 2>/dev/null | grep -c '^sha256')
check "export of a time range: each recording that overlaps it" 2 "$out"
out=$(TZ=Europe/Berlin "$dvrfs" export "$work/clip.img" --from 1700000001 --to 2023-11-14T23:13:21Z --merge \
  --local -o "$work/range/" 2>"$work/err" | grep -v '^sha256')
check "export --merge of a range whose damaged block lies after it: complete" 0 "${PIPESTATUS[0]}"
check "export --merge: the recordings of the range in one file, --local times" \
  "$work/range/rows0-1-20231114T221320Z.mp4: rows 0, 1, 50 frames, 3600.0 s from 2023-11-14T23:13:21+0100, 25 frames/s (the stream's timing)" "$out"
check "export --merge: no warning of the damage outside the range" "" "$(cat "$work/err")"
check "list --local: the date and time in the workstation's zone" "$(printf '0\t0\t1700000000\t1700000002\t2023/11/14 23:13:20-23:13:22')" \
  "$(TZ=Europe/Berlin "$dvrfs" list --local "$work/clip.img" | head -1)"

# --- recover: a list ring of four that wrapped over the two oldest recordings
"$mkdvrfs" --data-blocks 16 --list-max 4 --h264 "$clip" \
  --overwritten 0:1:1699990000:1699990002:25 --overwritten 2:3:1699993600:1699993602:25 \
  --recording 0:4:5:1700000000:1700000002:25 --recording 1:6:7:1700003600:1700003602:25 \
  --recording 2:8:8:1700007200:1700007201:25 --recording 3:9:10:1700010800:1700010802:25 "$work/wrapped.img" >/dev/null
out=$("$dvrfs" recover "$work/wrapped.img" 2>"$work/err")
check "recover finds the blocks whose entries were written over" \
  "$(printf 'blocks 0:3\t4 blocks\t100 frames\tafter -\tbefore 2023-11-14T22:13:20Z')" "$out"
check "recover says what it read" "dvrfs: 1 run(s) of unlisted blocks; 16 blocks scanned, 9 headers read (UTC)" \
  "$(cat "$work/err")"
check "recover --local" "$(printf 'blocks 0:3\t4 blocks\t100 frames\tafter -\tbefore 2023-11-14T23:13:20+0100')" \
  "$(TZ=Europe/Berlin "$dvrfs" recover --local "$work/wrapped.img" 2>/dev/null)"
check "recover --json" '{"blocks_scanned": 16, "headers_read": 9, "runs": [{"first_block": 0, "last_block": 3, "blocks": 4, "frames": 100, "after": null, "before": "2023-11-14T22:13:20Z"}]}' \
  "$("$dvrfs" recover "$work/wrapped.img" --json 2>/dev/null)"
out=$("$dvrfs" export "$work/wrapped.img" --blocks 0:3 -o "$work/out")
check "export --blocks of the run" "$work/out/blocks0-3.mp4: blocks 0 to 3, 100 frames, 4.0 s, 25 frames/s" "$out"
out=$("$dvrfs" extract "$work/wrapped.img" --blocks 0:3 -o "$work/run.h264")
check "extract --blocks writes the run's frames" "100 frames, $(wc -c < "$work/run.h264") bytes written to $work/run.h264" "$out"
"$dvrfs" export "$work/wrapped.img" --blocks 3 -o "$work/out" 2>/dev/null
check "export --blocks takes FIRST:LAST" 2 $?

# --- an E01 image of a disk: read as the disk, its acquisition named
if command -v ewfacquire >/dev/null; then
  ewfacquire -u -q -c fast -t "$work/case" "$work/wrapped.img" >/dev/null 2>&1
  check "list of the E01 is the list of the disk" "$("$dvrfs" list "$work/wrapped.img")" "$("$dvrfs" list "$work/case.E01")"
  check "info names the image and what it says" "image=E01 image, 1 segment
image_media_size=$(stat -c %s "$work/wrapped.img")" "$("$dvrfs" info "$work/case.E01" | grep -E '^image(_media_size)?=')"
fi

# --- a raw image in numbered pieces: read as the disk, its pieces counted
dd if="$work/one.img" of="$work/one.001" bs=1M count=64 conv=sparse status=none
dd if="$work/one.img" of="$work/one.002" bs=1M skip=64 conv=sparse status=none
check "list of the split image is the list of the disk" "$("$dvrfs" list "$work/one.img")" "$("$dvrfs" list "$work/one.001")"
check "info names the split image" "image=split raw image, 2 pieces" "$("$dvrfs" info "$work/one.001" | grep '^image=')"

# --- report
"$dvrfs" report "$work/clip.img" -o "$work/report" >/dev/null
check "report: an HTML page with a picture of each recording" 2 "$(grep -o '<img alt="row [0-9]*" src="data:image/png;base64,' "$work/report/report.html" | wc -l)"
check "report: the JSON lists the rows list --json lists" "$("$dvrfs" list --json "$work/clip.img" | grep -o '"row": [0-9]*, "idx": [0-9]*')" \
  "$(grep -o '"row": [0-9]*, "idx": [0-9]*' "$work/report/report.json")"
check "report: the CSV has a line a recording" 3 "$(wc -l < "$work/report/report.csv")"

# --- hash
check "hash is the disk's SHA-256" "$(sha256sum "$work/one.img")" "$("$dvrfs" hash "$work/one.img")"

echo "$((checks - failures)) passed, $failures failed"
[ "$failures" -eq 0 ]
