#!/usr/bin/env python3
"""fix_tlb_libid.py TLB IDL: writes the library's uuid from IDL into TLB's library GUID.

widl 7 (Debian's mingw-w64-tools) overwrites the last byte of the library GUID in the
typelib's GUID table when a library holds dispinterfaces and coclasses, so the library
would register under a wrong LIBID. The GUID table is otherwise consistent (its hash was
computed from the right GUID), so restoring the 16 bytes is enough.
"""
import re
import struct
import sys
import uuid

HEADER = struct.Struct('<4sI' + 'i' * 19)  # MSFT header, 0x54 bytes
SEGMENT = struct.Struct('<iiii')
GUID_SEGMENT = 5


def library_uuid(idl_text):
    match = re.search(r'uuid\(\s*([0-9A-Fa-f-]{36})\s*\)[^\]]*\]\s*library\b', idl_text)
    if not match:
        sys.exit('no library uuid in the IDL')
    return uuid.UUID(match.group(1))


def main(tlb_path, idl_path):
    with open(idl_path, encoding='utf-8') as f:
        libid = library_uuid(f.read())
    data = bytearray(open(tlb_path, 'rb').read())
    header = HEADER.unpack_from(data)
    if header[0] != b'MSFT':
        sys.exit('not an MSFT type library')
    posguid, varflags, nrtypeinfos = header[2], header[5], header[8]
    segdir = HEADER.size + 4 * nrtypeinfos + (4 if varflags & 0x100 else 0)
    guid_offset = SEGMENT.unpack_from(data, segdir + GUID_SEGMENT * SEGMENT.size)[0]
    data[guid_offset + posguid:guid_offset + posguid + 16] = libid.bytes_le
    open(tlb_path, 'wb').write(bytes(data))


if __name__ == '__main__':
    main(sys.argv[1], sys.argv[2])
