# Makes file systems to test on, in image files. To be sourced after tools/lib.sh.
#
#     make_file_systems FOLDER USER   mounts them below FOLDER, which must be there; sets
#                                     file_systems to the value of MARROWDALE_TEST_DIRS for root
#                                     and file_systems_of_user to that for USER, and
#                                     file_systems_missing to lines of those left out, and why
#     remove_file_systems FOLDER      unmounts them; the images go with FOLDER
# shellcheck shell=bash

file_systems=
file_systems_of_user=
file_systems_missing=()

leave_out() { file_systems_missing+=("$1: $2"); }

# Sparse images: tests of a million entries need room for as many inodes, not disk space. Without a
# journal, ext4 looks for a minute at each inode that was freed whenever it needs a new one.
make_image() {
    local kind=$1 image=$2
    truncate -s 4G "$image"
    case $kind in
    ext4) mkfs.ext4 -q -F -i 4096 "$image" ;;
    xfs) mkfs.xfs -q -f "$image" ;;
    btrfs) mkfs.btrfs -q -f "$image" ;;
    esac
}

mount_file_system() {
    local kind=$1 folder=$2 place=$2/$1
    mkdir "$place"
    if [[ $kind == tmpfs ]]; then
        mount -t tmpfs -o size=2g,nr_inodes=0 marrowdale-test "$place"
    else
        make_image "$kind" "$folder/$kind.img" && mount -o loop "$folder/$kind.img" "$place"
    fi
}

make_file_systems() {
    local folder=$1 user=$2 kind reason
    for kind in ext4 xfs btrfs tmpfs; do
        if ! is_root; then
            leave_out "$kind" "only root can mount it"
        elif ! grep -qw "$kind" /proc/filesystems && ! modprobe -q "$kind" 2>/dev/null; then
            leave_out "$kind" "this kernel does not have it"
        elif ! reason=$(mount_file_system "$kind" "$folder" 2>&1); then
            leave_out "$kind" "${reason//$'\n'/; }"
        else
            mkdir "$folder/$kind/root" "$folder/$kind/user"
            chown "$user" "$folder/$kind/user"
            chmod 755 "$folder/$kind"
            file_systems+=${file_systems:+:}$kind=$folder/$kind/root
            file_systems_of_user+=${file_systems_of_user:+:}$kind=$folder/$kind/user
        fi
    done
}

remove_file_systems() {
    local folder=$1 kind
    for kind in ext4 xfs btrfs tmpfs; do
        if mountpoint -q "$folder/$kind"; then
            umount --recursive "$folder/$kind" || umount --lazy --recursive "$folder/$kind"
        fi
    done
}
