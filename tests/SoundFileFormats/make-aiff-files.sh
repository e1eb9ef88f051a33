#!/bin/sh
# Makes AIFF and AIFC files the way other programs write them (sox, ffmpeg,
# libsndfile's tools), for the AIFF reader's tests to compare against what
# those programs say the files hold. Tones last 10 ms at 8 kHz (80 frames;
# 81 for the 8-bit sox file, so that its audio ends on an odd byte); the
# libsndfile files are converted from a 44.1 kHz stereo tone (441 frames).
# The rate-*.aiff files hold one frame at each of the usual sample rates.
# Usage: make-aiff-files.sh OUTDIR
set -eu
out=${1:?usage: make-aiff-files.sh OUTDIR}

need() {
  command -v "$1" >/dev/null 2>&1 || {
    echo "make-aiff-files.sh: $1 is missing: install the Debian package $2" >&2
    exit 1
  }
}
need sox sox
need ffmpeg ffmpeg
need sndfile-convert sndfile-programs

mkdir -p "$out"
cd "$out"
rm -f ./*.aiff ./*.aifc ./*.wav

tone() { sox -V1 -R -D -r 8000 -n "$@" synth "${len:-0.01}" sine 440; }
fftone() {
  ffmpeg -nostdin -hide_banner -loglevel error -y \
    -f lavfi -i "sine=frequency=440:sample_rate=8000:duration=0.01" "$@"
}

len=81s tone -c 1 -b 8 sox-s8-odd.aiff
tone -c 2 -b 16 sox-s16-stereo.aiff
tone -c 1 -b 24 sox-s24.aiff
tone -c 6 -b 32 sox-s32-6ch.aiff
tone -c 1 -b 16 -t aifc sox-s16.aifc
tone -c 2 -e floating-point -b 32 sox-f32.aifc
tone -c 1 -e floating-point -b 64 sox-f64.aifc

fftone -c:a pcm_s8 ffmpeg-s8.aiff
fftone -c:a pcm_s16be -ac 2 ffmpeg-s16-stereo.aiff
fftone -c:a pcm_s24be ffmpeg-s24.aiff
fftone -c:a pcm_s32be ffmpeg-s32.aiff
fftone -c:a pcm_f32be -f aiff ffmpeg-f32.aifc
fftone -c:a pcm_f64be -f aiff ffmpeg-f64.aifc
fftone -c:a pcm_s16le -f aiff ffmpeg-sowt.aifc
fftone -c:a pcm_u8 -f aiff ffmpeg-u8.aifc

sox -V1 -R -D -r 44100 -n -c 2 -b 16 source.wav synth 0.01 sine 440
sndfile-convert -pcms8 source.wav sndfile-s8.aiff
sndfile-convert -pcm16 source.wav sndfile-s16.aiff
sndfile-convert -pcm24 source.wav sndfile-s24.aiff
sndfile-convert -pcm32 source.wav sndfile-s32.aiff
sndfile-convert -float32 source.wav sndfile-f32.aiff
sndfile-convert -float64 source.wav sndfile-f64.aiff
sndfile-convert -endian=little -pcm16 source.wav sndfile-sowt.aiff
sndfile-convert -endian=little -pcm24 source.wav sndfile-le24.aiff

for rate in 8000 11025 16000 22050 32000 44100 48000 88200 96000 176400 192000 \
  44055.944055944055 47952.047952047952 22050.5; do
  sox -V1 -R -D -r "$rate" -n -c 1 -b 16 "rate-$rate.aiff" synth 1s sine 440
done
