#!/usr/bin/env python3
"""Checks the code signature of one slice of a Mach-O program.

    scripts/check-macho-signature.py FILE [ARCH]      (ARCH: arm64, the default, or x86_64)

macOS kills an arm64 program whose signature is missing or does not match its
bytes, so the ad-hoc signature the linker writes must survive everything done
to the file after the link (merging into a universal binary, packing). This
reads FILE (a thin Mach-O or a universal one holding ARCH), follows
LC_CODE_SIGNATURE to the embedded signature (a SuperBlob), takes its
CodeDirectory and recomputes the hash of every page of the slice up to the
code limit. Prints one line and exits 0 when every page matches, else prints
what is wrong and exits 1. Apple's formats: <mach-o/loader.h>, <mach-o/fat.h>
and the code-signing structures of xnu's osfmk/kern/cs_blobs.h.
"""
import hashlib
import struct
import sys

CPU_TYPES = {"arm64": 0x0100000C, "x86_64": 0x01000007}
FAT_MAGIC, MH_MAGIC_64 = 0xCAFEBABE, 0xFEEDFACF
LC_CODE_SIGNATURE = 0x1D
SUPERBLOB_MAGIC, CODEDIRECTORY_MAGIC, CSSLOT_CODEDIRECTORY = 0xFADE0CC0, 0xFADE0C02, 0
CS_ADHOC = 0x2
# hashType of a CodeDirectory: (hashlib name, bytes of the stored hash)
HASH_TYPES = {1: ("sha1", 20), 2: ("sha256", 32), 3: ("sha256", 20), 4: ("sha384", 48)}


def fail(message):
    print(f"signature: FAILED ({message})")
    sys.exit(1)


def slice_of(data, arch):
    """The bytes of the thin Mach-O for arch (the file itself when thin)."""
    if len(data) >= 8 and struct.unpack_from(">I", data)[0] == FAT_MAGIC:
        (count,) = struct.unpack_from(">I", data, 4)
        for i in range(count):
            cputype, _, offset, size, _ = struct.unpack_from(">iiIII", data, 8 + 20 * i)
            if cputype == CPU_TYPES[arch]:
                return data[offset:offset + size]
        fail(f"no {arch} slice")
    if len(data) < 32 or struct.unpack_from("<I", data)[0] != MH_MAGIC_64:
        fail("not a 64-bit Mach-O file")
    if struct.unpack_from("<i", data, 4)[0] != CPU_TYPES[arch]:
        fail(f"not an {arch} program")
    return data


def check(path, arch):
    with open(path, "rb") as f:
        macho = slice_of(f.read(), arch)
    ncmds = struct.unpack_from("<I", macho, 16)[0]
    offset, signature = 32, None
    for _ in range(ncmds):
        cmd, cmdsize = struct.unpack_from("<II", macho, offset)
        if cmd == LC_CODE_SIGNATURE:
            signature = struct.unpack_from("<II", macho, offset + 8)
        offset += cmdsize
    if signature is None:
        fail("no LC_CODE_SIGNATURE: the program is not signed")
    sig_off, sig_size = signature
    blob = macho[sig_off:sig_off + sig_size]
    magic, _, count = struct.unpack_from(">III", blob)
    if magic != SUPERBLOB_MAGIC:
        fail(f"signature magic {magic:#x}, not an embedded signature")
    directories = [o for t, o in (struct.unpack_from(">II", blob, 12 + 8 * i) for i in range(count))
                   if t == CSSLOT_CODEDIRECTORY]
    if not directories:
        fail("no CodeDirectory in the signature")
    cd = directories[0]
    magic, _, _, flags, hash_offset, _, _, n_code_slots, code_limit = struct.unpack_from(">9I", blob, cd)
    hash_size, hash_type, _, page_shift = struct.unpack_from(">4B", blob, cd + 36)
    if magic != CODEDIRECTORY_MAGIC:
        fail(f"CodeDirectory magic {magic:#x}")
    if hash_type not in HASH_TYPES or HASH_TYPES[hash_type][1] != hash_size:
        fail(f"hash type {hash_type} with {hash_size}-byte hashes")
    if code_limit != sig_off:
        fail(f"the code limit {code_limit} is not where the signature begins ({sig_off})")
    page = 1 << page_shift if page_shift else code_limit
    if n_code_slots != -(-code_limit // page):
        fail(f"{n_code_slots} hash slots for {code_limit} bytes in {page}-byte pages")
    name = HASH_TYPES[hash_type][0]
    for i in range(n_code_slots):
        computed = hashlib.new(name, macho[i * page:min((i + 1) * page, code_limit)]).digest()[:hash_size]
        stored = blob[cd + hash_offset + i * hash_size:cd + hash_offset + (i + 1) * hash_size]
        if computed != stored:
            fail(f"page {i} (bytes {i * page} to {min((i + 1) * page, code_limit) - 1}) does not match its hash")
    kind = "ad-hoc" if flags & CS_ADHOC else "signed"
    print(f"signature: ok ({arch} slice, {kind}, {name.upper()}, {n_code_slots} pages of {page} bytes match"
          f" up to byte {code_limit})")


if __name__ == "__main__":
    if len(sys.argv) not in (2, 3) or (len(sys.argv) == 3 and sys.argv[2] not in CPU_TYPES):
        sys.exit(__doc__)
    try:
        check(sys.argv[1], sys.argv[2] if len(sys.argv) == 3 else "arm64")
    except (OSError, struct.error) as e:
        fail(f"cannot read {sys.argv[1]}: {e}")
