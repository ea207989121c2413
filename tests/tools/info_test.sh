#!/usr/bin/env bash
# End to end: mkdvrfs writes disks, dvrfs info reads them; output and exit
# statuses compared exactly.
#   info_test.sh MKDVRFS DVRFS
set -u
mkdvrfs=$1
dvrfs=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
failures=0

check() {  # check NAME EXPECTED ACTUAL
  if [ "$2" != "$3" ]; then
    echo "FAIL: $1"
    diff <(printf '%s\n' "$2") <(printf '%s\n' "$3")
    failures=$((failures + 1))
  fi
}

"$mkdvrfs" --help | grep -q '^Usage: mkdvrfs' || { echo "FAIL: mkdvrfs --help"; failures=$((failures + 1)); }
"$mkdvrfs" --no-such-option "$work/x.img" 2>/dev/null
check "mkdvrfs usage error" 2 $?
"$mkdvrfs" --damage list "$work/x.img" 2>/dev/null
check "mkdvrfs damage without index" 2 $?

"$mkdvrfs" --adapter-run 110:15 \
  --recording 0:0:2:1700000000:1700000600 \
  --recording 1:6:1:1700000700:1700001500 --damage list:0 "$work/disk.img" >/dev/null
out=$("$dvrfs" info "$work/disk.img" --dump)
check "dvrfs info exit status" 0 $?
check "dvrfs info output" "magic=0x1234
header_size=252
block_size=4096
block_count=32892
block_table_count=4
offset_block_space=1048576
super_offset=0
super_offset_backup=524288
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

"$mkdvrfs" --damage primary-super "$work/bad.img" >/dev/null
err=$("$dvrfs" info "$work/bad.img" 2>&1 >/dev/null)
check "dvrfs info on a damaged superblock" 1 $?
check "dvrfs info says why" "dvrfs: $work/bad.img: not a recorder disk: the superblock is damaged (code 33)" "$err"

"$mkdvrfs" --version 0 "$work/blank.img" >/dev/null
"$dvrfs" info "$work/blank.img" >/dev/null 2>&1
check "dvrfs info on an unconfigured disk" 1 $?
"$dvrfs" info >/dev/null 2>&1
check "dvrfs usage error" 2 $?

echo "$failures failed"
[ "$failures" -eq 0 ]
