#!/usr/bin/env python3
"""Pulls the H.264 or HEVC track of a small MP4 apart for the test fixtures.

usage: mp4_extract.py IN.mp4 OUT_PREFIX
writes OUT_PREFIX.avcc (the AVCDecoderConfigurationRecord, ISO/IEC 14496-15 5.2.4.1) or, for an
hvc1/hev1 track, OUT_PREFIX.hvcc (the HEVCDecoderConfigurationRecord, 8.3.3.1), each without its
box header, and OUT_PREFIX.nal (every sample of the first video track in decode order,
concatenated as stored: NAL units behind big-endian length fields), and prints one line
"sample <offset in .nal> <size>" per sample.
"""
import struct
import sys

CONTAINERS = {b"moov", b"trak", b"mdia", b"minf", b"stbl", b"edts", b"dinf"}


def boxes(data, start, end):
    pos = start
    while pos + 8 <= end:
        size, kind = struct.unpack(">I4s", data[pos:pos + 8])
        header = 8
        if size == 1:
            size = struct.unpack(">Q", data[pos + 8:pos + 16])[0]
            header = 16
        elif size == 0:
            size = end - pos
        yield kind, pos + header, pos + size
        pos += size


def find_tracks(data):
    for kind, s, e in boxes(data, 0, len(data)):
        if kind == b"moov":
            for k2, s2, e2 in boxes(data, s, e):
                if k2 == b"trak":
                    yield s2, e2


def child(data, s, e, path):
    for name in path:
        for kind, cs, ce in boxes(data, s, e):
            if kind == name:
                s, e = cs, ce
                break
        else:
            return None
    return s, e


def full_box_entries(data, s):
    return struct.unpack(">I", data[s + 4:s + 8])[0]


def main():
    src, prefix = sys.argv[1], sys.argv[2]
    data = open(src, "rb").read()
    for ts, te in find_tracks(data):
        stbl = child(data, ts, te, [b"mdia", b"minf", b"stbl"])
        if stbl is None:
            continue
        stsd = child(data, *stbl, [b"stsd"])
        # stsd: version/flags, entry count, then the sample entry; avc1 and hvc1 have 78 bytes
        # before their child boxes.
        entry_start = stsd[0] + 8
        esize, ekind = struct.unpack(">I4s", data[entry_start:entry_start + 8])
        if ekind in (b"avc1", b"avc3"):
            box, suffix = b"avcC", ".avcc"
        elif ekind in (b"hvc1", b"hev1"):
            box, suffix = b"hvcC", ".hvcc"
        else:
            continue
        record = child(data, entry_start + 8 + 78, entry_start + esize, [box])
        open(prefix + suffix, "wb").write(data[record[0]:record[1]])

        s, _ = child(data, *stbl, [b"stsz"])
        fixed, count = struct.unpack(">II", data[s + 4:s + 12])
        sizes = [fixed] * count if fixed else list(struct.unpack(">%dI" % count, data[s + 12:s + 12 + 4 * count]))

        co = child(data, *stbl, [b"stco"])
        if co:
            n = full_box_entries(data, co[0])
            offsets = list(struct.unpack(">%dI" % n, data[co[0] + 8:co[0] + 8 + 4 * n]))
        else:
            co = child(data, *stbl, [b"co64"])
            n = full_box_entries(data, co[0])
            offsets = list(struct.unpack(">%dQ" % n, data[co[0] + 8:co[0] + 8 + 8 * n]))

        s, _ = child(data, *stbl, [b"stsc"])
        n = full_box_entries(data, s)
        runs = [struct.unpack(">III", data[s + 8 + 12 * i:s + 20 + 12 * i]) for i in range(n)]

        out = bytearray()
        sample = 0
        for ci, chunk_offset in enumerate(offsets):
            per_chunk = 0
            for first, samples, _ in runs:
                if first - 1 <= ci:
                    per_chunk = samples
            pos = chunk_offset
            for _ in range(per_chunk):
                if sample >= len(sizes):
                    break
                print("sample %d %d" % (len(out), sizes[sample]))
                out += data[pos:pos + sizes[sample]]
                pos += sizes[sample]
                sample += 1
        open(prefix + ".nal", "wb").write(out)
        return 0
    sys.exit("no H.264 or HEVC track in " + src)


if __name__ == "__main__":
    sys.exit(main())
