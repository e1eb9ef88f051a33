#!/bin/sh
# Makes the small WAVE, Wave64, AIFF and AIFC files that other programs write
# (sox, ffmpeg, libsndfile's tools), for the chunk editor's tests to list and
# edit. Every file holds 10 ms of a 440 Hz tone at 8 kHz (81 frames for the
# 8-bit files, so that the audio chunk ends on an odd byte).
# Usage: make-foreign-files.sh OUTDIR
set -eu
out=${1:?usage: make-foreign-files.sh OUTDIR}

need() {
  command -v "$1" >/dev/null 2>&1 || {
    echo "make-foreign-files.sh: $1 is missing: install the Debian package $2" >&2
    exit 1
  }
}
need sox sox
need ffmpeg ffmpeg
need sndfile-convert sndfile-programs
need sndfile-metadata-set sndfile-programs

mkdir -p "$out"
cd "$out"
rm -f ./*.wav ./*.w64 ./*.aiff ./*.aifc

# -R: no random dither, -D: none at all; -r before -n: the tone's own rate.
tone() { sox -V1 -R -D -r 8000 -n "$@" synth "${len:-0.01}" sine 440; }
fftone() {
  ffmpeg -nostdin -hide_banner -loglevel error -y \
    -f lavfi -i "sine=frequency=440:sample_rate=8000:duration=0.01" "$@"
}

tone -c 2 -b 16 sox-s16.wav
tone -c 1 -b 24 sox-s24.wav
len=81s tone -c 1 -b 8 sox-u8-odd.wav
fftone -c:a pcm_s16le ffmpeg-s16.wav
fftone -c:a pcm_s24le -metadata title="A tone" -metadata artist="Tarn" ffmpeg-s24-info.wav
fftone -c:a pcm_s16le -write_bext 1 -metadata description="A take" \
  -metadata originator="Tarn" ffmpeg-bext.wav
sndfile-metadata-set --bext-description "A take" --bext-originator "Tarn" \
  --str-title "A tone" sox-s16.wav sndfile-bext.wav

tone -c 1 -b 16 -t w64 sox-s16.w64
len=81s tone -c 1 -b 8 -t w64 sox-u8-odd.w64
fftone -c:a pcm_s24le ffmpeg-s24.w64
sndfile-convert -float32 sox-s16.wav sndfile-f32.w64

tone -c 1 -b 16 sox-s16.aiff
len=81s tone -c 1 -b 8 sox-s8-odd.aiff
fftone -c:a pcm_s16be -metadata title="A tone" ffmpeg-name.aiff
sndfile-convert -pcm16 sox-s16.wav sndfile-s16.aiff
tone -c 1 -b 16 -t aifc sox-s16.aifc
fftone -c:a pcm_s16le -f aiff ffmpeg-sowt.aifc
