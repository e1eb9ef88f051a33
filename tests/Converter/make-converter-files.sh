#!/bin/sh
# Makes the outside converter's test files with ffmpeg and sox, and beside
# each FILE the samples ffmpeg itself decodes from it: FILE.f32 (32-bit
# float, interleaved, little-endian), where ffmpeg decodes FILE at all. The tone has different content in
# every channel (sines plus seeded noise), 1.5 s long.
# Also the bad inputs: a truncated MP3, an MP4 whose sample table lies,
# video-only movies, seeded noise bytes named .mp3, an empty file.
# Usage: make-converter-files.sh OUTDIR
set -eu
out=${1:?usage: make-converter-files.sh OUTDIR}
for tool in ffmpeg sox; do
  command -v "$tool" >/dev/null 2>&1 || {
    echo "make-converter-files.sh: $tool is missing: install the Debian package $tool" >&2
    exit 1
  }
done
mkdir -p "$out"
cd "$out"
rm -f ./*

ff() { ffmpeg -nostdin -hide_banner -loglevel error -y "$@"; }

# tone CHANNELS RATE OUTPUT ENCODER-ARGS...
tone() {
  ch=$1 rate=$2 file=$3
  shift 3
  expr=""
  c=0
  while [ "$c" -lt "$ch" ]; do
    e="0.3*sin($((330 + 110 * c))*2*PI*t)+0.2*(random($c)-0.5)"
    expr="${expr:+$expr|}$e"
    c=$((c + 1))
  done
  case $ch in
    1) layout=mono ;; 2) layout=stereo ;; 3) layout=3.0 ;; 4) layout=quad ;; *) layout=5.1 ;;
  esac
  ff -f lavfi -i "aevalsrc=${expr}:c=${layout}:s=${rate}:d=1.5" "$@" "$file"
}

tone 2 44100 aifc-none.wav -c:a pcm_s16le
sox -V1 aifc-none.wav -t aifc -e signed-integer -b 16 aifc-none.aifc
rm aifc-none.wav
tone 2 48000 aifc-sowt.aifc -c:a pcm_s16le -f aiff
tone 1 44100 aifc-fl32.aifc -c:a pcm_f32be -f aiff
tone 2 48000 aifc-ulaw.aifc -c:a pcm_mulaw -f aiff
tone 1 44100 aifc-alaw.aifc -c:a pcm_alaw -f aiff
tone 2 44100 lame.mp3 -c:a libmp3lame -b:a 160k
tone 1 48000 lame-mono.mp3 -c:a libmp3lame -q:a 4
tone 2 48000 aac.m4a -c:a aac -b:a 128k
tone 6 48000 aac-6ch.m4a -c:a aac -b:a 256k
tone 2 44100 alac.m4a -c:a alac
tone 6 96000 alac-6ch.m4a -c:a alac -sample_fmt s32p
tone 1 44100 alac.caf -c:a alac
# FLAC in CAF by way of WAVE: ffmpeg's CAF reader refuses the FLAC CAF
# its writer makes straight from the tone generator.
tone 2 48000 flac.wav -c:a pcm_s16le
ff -i flac.wav -c:a flac flac.caf
tone 4 96000 flac24.wav -c:a pcm_s24le
ff -i flac24.wav -c:a flac flac24.caf
rm flac.wav flac24.wav
tone 2 48000 flac.m4a -c:a flac -strict -2 -f mp4
tone 4 96000 flac24.m4a -c:a flac -sample_fmt s32 -strict -2 -f mp4
tone 2 48000 pcm16.mov -c:a pcm_s16le
tone 6 96000 pcm24.mov -c:a pcm_s24le
tone 2 44100 pcm32.mov -c:a pcm_s32be
tone 3 48000 pcmf32.mov -c:a pcm_f32le
tone 1 44100 pcm16.avi -c:a pcm_s16le
tone 2 48000 pcmu8.avi -c:a pcm_u8

# FILE.f32 only where ffmpeg itself decodes FILE (its CAF reader, for one,
# may not take the FLAC it writes into CAF).
for f in *.aifc *.mp3 *.m4a *.caf *.mov *.avi; do
  ff -i "$f" -map 0:a:0 -f f32le -c:a pcm_f32le "$f.f32" 2>/dev/null || rm -f "$f.f32"
done

# Bad inputs.
size=$(wc -c <lame.mp3)
head -c $((size / 3)) lame.mp3 >bad-truncated.mp3
ff -i bad-truncated.mp3 -f f32le -c:a pcm_f32le bad-truncated.mp3.f32
cp alac.m4a bad-lying.m4a
# The sample-size table claims 2^31 - 1 entries of 4 GB each.
at=$(grep -obUa stsz bad-lying.m4a | head -n 1 | cut -d: -f1)
printf '\377\377\377\360\177\377\377\377' |
  dd of=bad-lying.m4a bs=1 seek=$((at + 8)) conv=notrunc 2>/dev/null
cp alac.m4a bad-chunk-offsets.m4a
# The chunk offsets point far beyond the file.
at=$(grep -obUa stco bad-chunk-offsets.m4a | head -n 1 | cut -d: -f1)
printf '\177\377\377\377\177\377\377\377' |
  dd of=bad-chunk-offsets.m4a bs=1 seek=$((at + 12)) conv=notrunc 2>/dev/null
ff -f lavfi -i testsrc=size=64x48:rate=10:duration=1 -c:v mpeg4 bad-video-only.mov
ff -f lavfi -i testsrc=size=64x48:rate=10:duration=1 -c:v mpeg4 bad-video-only.avi
ff -f lavfi -i "anoisesrc=seed=3:d=1" -f s16le bad-noise.mp3
: >bad-empty.mp3
echo "not a movie" >bad-text.m4a
