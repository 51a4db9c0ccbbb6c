#!/bin/bash
# Builds the initramfs the VM tier boots: busybox, the kernel modules of the HID and input path
# (with their dependencies, decompressed), systemd-udevd so that programs discover devices
# exactly as on a full system, the project's programs with the shared libraries ldd finds for
# them, the scenario scripts and an /init that runs them.
#
# usage: build-initramfs.sh --out FILE --kernel-version VERSION [--busybox PATH]
#            [--program PATH]... [--library PATH]... [--tree DIR]... [--file SRC:DEST]... [--dir SRC:DEST]...
#   --program  an executable; copied at its own path (so build-tree RUNPATHs keep working),
#              linked into /usr/bin, and its libraries with it
#   --library  a shared object loaded at run time (a plug-in); copied at its own path, with its
#              libraries
#   --tree     a file system tree (an unpacked package) copied at the image's root, so its
#              programs run from the paths they are installed at, with the libraries they need
#              from outside the tree
#   --file, --dir  copied into the image at DEST
# Exit status 77: something needed is not installed on this machine (the reason is printed).
set -euo pipefail

out=""
kver=""
busybox=/bin/busybox
programs=()
libraries=()
trees=()
files=()
dirs=()
modules=(hid uhid hid-generic uinput evdev)

while [ $# -gt 0 ]; do
    case "$1" in
        --out) out="$2"; shift 2 ;;
        --kernel-version) kver="$2"; shift 2 ;;
        --busybox) busybox="$2"; shift 2 ;;
        --program) programs+=("$2"); shift 2 ;;
        --library) libraries+=("$2"); shift 2 ;;
        --tree) trees+=("$2"); shift 2 ;;
        --file) files+=("$2"); shift 2 ;;
        --dir) dirs+=("$2"); shift 2 ;;
        *) echo "build-initramfs: unknown argument $1" >&2; exit 2 ;;
    esac
done
[ -n "$out" ] && [ -n "$kver" ] || { echo "build-initramfs: --out and --kernel-version are required" >&2; exit 2; }

skip() { echo "SKIP: $*" >&2; exit 77; }

[ -x "$busybox" ] || skip "busybox not found at $busybox (install busybox-static)"
case "$(ldd "$busybox" 2>&1 || true)" in *"not a dynamic"*) ;; *) skip "$busybox is not statically linked (install busybox-static)" ;; esac
moddir=/lib/modules/$kver
[ -f "$moddir/modules.dep" ] || skip "no modules for kernel $kver in $moddir (install linux-image-amd64)"
udevd=""
for candidate in /usr/lib/systemd/systemd-udevd /lib/systemd/systemd-udevd; do
    if [ -x "$candidate" ]; then udevd=$candidate; break; fi
done
[ -n "$udevd" ] || skip "systemd-udevd not found (install udev)"

root=$(mktemp -d)
trap 'rm -rf "$root"' EXIT

mkdir -p "$root"/{bin,sbin,usr/bin,usr/sbin,dev,proc,sys,run,tmp,etc,lib/modules/"$kver",usr/lib/systemd,usr/lib/udev/rules.d,scenarios}
cp "$busybox" "$root/bin/busybox"
for applet in $("$busybox" --list); do
    [ -e "$root/bin/$applet" ] || ln -s busybox "$root/bin/$applet"
done

# Copy a file to the same path inside the image, following symbolic links to the real file.
copy_at_own_path() {
    local path="$1"
    [ -e "$root$path" ] && return 0
    mkdir -p "$root$(dirname "$path")"
    cp -L "$path" "$root$path"
}

# Copy the shared libraries ldd resolves for an ELF file, and the dynamic loader; those inside
# `inside` (a tree copied whole) are there already.
copy_libraries() {
    local elf="$1" inside="${2:-}" line lib
    if ! ldd "$elf" >/dev/null 2>&1; then return 0; fi  # static
    if ldd "$elf" | grep -q 'not found'; then
        echo "build-initramfs: $elf needs a library ldd cannot find:" >&2
        ldd "$elf" | grep 'not found' >&2
        exit 1
    fi
    while read -r line; do
        lib=""
        case "$line" in
            *"=> /"*) lib=${line#*=> }; lib=${lib%% (*} ;;
            /*) lib=${line%% (*} ;;
        esac
        [ -n "$lib" ] || continue
        if [ -n "$inside" ]; then case "$lib" in "$inside"/*) continue ;; esac; fi
        copy_at_own_path "$lib"
        case "$lib" in /lib/* | /lib64/* | /usr/*) ;; *) strip_copy "$lib" ;; esac
    done < <(ldd "$elf")
}

# The project's own files lose their debugging sections: the image is read by an emulated machine.
strip_copy() {
    command -v strip > /dev/null && strip --strip-debug "$root$1" 2> /dev/null || true
}

for program in "${programs[@]}"; do
    program=$(realpath "$program")
    copy_at_own_path "$program"
    strip_copy "$program"
    ln -sf "$program" "$root/usr/bin/$(basename "$program")"
    copy_libraries "$program"
done
for library in "${libraries[@]}"; do
    library=$(realpath "$library")
    copy_at_own_path "$library"
    strip_copy "$library"
    copy_libraries "$library"
done

for tree in "${trees[@]}"; do
    tree=$(realpath "$tree")
    cp -a "$tree/." "$root/"
    while IFS= read -r -d '' file; do
        [ "$(head -c 4 "$file" | od -An -c | tr -d ' ')" = '177ELF' ] || continue
        strip_copy "${file#"$tree"}"
        copy_libraries "$file" "$tree"
    done < <(find "$tree" -type f -print0)
done

# systemd-udevd: the same program as udevadm on some systems, chosen by the name it runs under.
cp -L "$udevd" "$root/usr/lib/systemd/systemd-udevd"
copy_libraries "$(realpath "$udevd")"
ln -s ../lib/systemd/systemd-udevd "$root/usr/bin/udevadm"

# Kernel modules with their dependencies, dependencies first, decompressed for busybox insmod.
module_paths=()
add_module() {
    local name="$1" path dep
    path=$(modinfo -k "$kver" -n "$name" 2>/dev/null) || skip "kernel $kver has no module $name"
    [ "$path" = "(builtin)" ] && return 0
    for existing in "${module_paths[@]:-}"; do [ "$existing" = "$path" ] && return 0; done
    for dep in $(modinfo -k "$kver" -F depends "$name" | tr ',' ' '); do add_module "$dep"; done
    module_paths+=("$path")
}
for module in "${modules[@]}"; do add_module "$module"; done
: > "$root/etc/modules"
for path in "${module_paths[@]}"; do
    base=$(basename "$path")
    case "$path" in
        *.ko.xz) xz -dc "$path" > "$root/lib/modules/$kver/${base%.xz}"; base=${base%.xz} ;;
        *.ko.zst) zstd -qdc "$path" > "$root/lib/modules/$kver/${base%.zst}"; base=${base%.zst} ;;
        *.ko.gz) gzip -dc "$path" > "$root/lib/modules/$kver/${base%.gz}"; base=${base%.gz} ;;
        *) cp "$path" "$root/lib/modules/$kver/$base" ;;
    esac
    echo "$base" >> "$root/etc/modules"
done

for entry in "${files[@]}"; do
    mkdir -p "$root$(dirname "${entry#*:}")"
    cp -L "${entry%%:*}" "$root${entry#*:}"
done
for entry in "${dirs[@]}"; do
    mkdir -p "$root${entry#*:}"
    cp -rL "${entry%%:*}/." "$root${entry#*:}/"
done
[ -x "$root/init" ] || { echo "build-initramfs: no /init given (--file SRC:/init)" >&2; exit 2; }

mkdir -p "$(dirname "$out")"
(cd "$root" && find . | "$busybox" cpio -o -H newc -R 0:0 2>/dev/null) > "$out.tmp"
mv "$out.tmp" "$out"
echo "build-initramfs: $(du -h "$out" | cut -f1) with $(echo "${module_paths[@]}" | wc -w) modules -> $out" >&2
