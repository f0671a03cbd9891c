#!/usr/bin/env python3
"""Splits one video stream into the committed fixture files (run by fixtures-video.sh only).

<base>.frames     the stream's packets, concatenated in decoding order
<base>.extradata  the decoder configuration from the container (only when there is one)
<base>.txt        what ffprobe reports, one fact per line:
                    codec <name>
                    width <pixels>
                    height <pixels>
                    profile <number or name>   (only when reported)
                    level <number>             (only when reported)
                    frame <bytes> <pict_type I/P/B/S/?> <key 0/1>   one line per packet
"""
import json
import subprocess
import sys


def hexdump_bytes(dump):
    out = bytearray()
    for line in dump.strip().splitlines():
        if ':' not in line:
            continue
        # "00000000: 0000 01b0 0100 ... ascii"
        words = line.split(':', 1)[1].strip().split('  ')[0]
        out += bytes.fromhex(words.replace(' ', ''))
    return bytes(out)


def main(src, base):
    probe = json.loads(subprocess.check_output([
        'ffprobe', '-v', 'error', '-select_streams', 'v:0', '-show_streams', '-show_packets',
        '-show_frames', '-show_data', '-of', 'json', src]))
    stream = probe['streams'][0]
    mixed = probe.get('packets_and_frames', [])
    packets = [e for e in mixed if e.get('type') == 'packet']
    frames = [e for e in mixed if e.get('type') == 'frame']
    types = {f.get('pts'): f.get('pict_type', '?') for f in frames}
    with open(base + '.frames', 'wb') as f:
        for p in packets:
            f.write(hexdump_bytes(p['data']))
    extradata = hexdump_bytes(stream.get('extradata', ''))
    if extradata:
        with open(base + '.extradata', 'wb') as f:
            f.write(extradata)
    lines = ['codec ' + stream['codec_name'], 'width %d' % stream['width'],
             'height %d' % stream['height']]
    if 'profile' in stream:
        lines.append('profile %s' % stream['profile'])
    if stream.get('level', -99) != -99:
        lines.append('level %d' % stream['level'])
    for p in packets:
        key = 1 if 'K' in p.get('flags', '') else 0
        lines.append('frame %s %s %d' % (p['size'], types.get(p.get('pts'), '?'), key))
    with open(base + '.txt', 'w') as f:
        f.write('\n'.join(lines) + '\n')


if __name__ == '__main__':
    main(sys.argv[1], sys.argv[2])
