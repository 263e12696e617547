# Copies what tells about block devices, from /sys and /proc to the archive $1. Runs in the guest.
into=/run/record
declare -A seen=()
wanted=()

take() {
  local name
  for name in "$@"; do
    if [ -L "$name" ] || [ -r "$name" ]; then
      if [ -z "${seen[$name]}" ]; then wanted+=("$name"); fi
      seen[$name]=1
    fi
  done
}

# What a folder of the device tree says of itself; the buses that a disk hangs on are told by these alone.
take_device() {
  take "$1"/{uevent,subsystem,driver}
  take "$1"/{wwid,vendor,model,rev,serial,state,type,transport,address,firmware_rev,vpd_pg80,vpd_pg83,proc_name}
  take "$1"/{idVendor,idProduct,manufacturer,product,bInterfaceClass,bInterfaceSubClass,bInterfaceProtocol}
}

take_block() {
  local attribute
  take_device "$1"
  take "$1"/{size,ro,removable,hidden,dev,partition,start,diskseq,range,ext_range,alignment_offset,bdi,device,nsid}
  take "$1"/queue/{rotational,zoned,logical_block_size,physical_block_size,discard_granularity,discard_max_bytes}
  take "$1"/{dm/{name,uuid,suspended},md/{array_state,level,raid_disks,metadata_version},loop/backing_file}
  for attribute in holders slaves; do
    if [ -d "$1/$attribute" ]; then
      mkdir -p "$into$1/$attribute"
      take "$1/$attribute"/*
    fi
  done
}

shopt -s nullglob
for link in /sys/class/block/* /sys/block/* /sys/dev/block/*; do take "$link"; done
for link in /sys/class/block/*; do
  block=$(readlink -f "$link")
  take_block "$block"
  above=${block%/*}
  while [ "$above" != /sys/devices ]; do
    take_device "$above"
    above=${above%/*}
  done
done
take /proc/{swaps,partitions,mdstat,devices,filesystems}
mkdir -p "$into/proc/self"
cp --no-preserve=all -P --parents "${wanted[@]}" "$into" 2> >(grep -v 'error reading' >&2)
# Some attributes can be opened and not read, as the wwid of a disk that has none: they count as absent.
find "$into" -type f -empty | while read -r name; do
  cat "${name#"$into"}" >/dev/null 2>&1 || rm "$name"
done
cat /proc/self/mountinfo >"$into/proc/self/mountinfo"
tar -cf "$1" -C "$into" . && rm -r "$into"
