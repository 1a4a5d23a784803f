load_devices
insmod /rig/modules/vimc.ko
until_true 5 ls /dev/media0
cat >/rig/bare.json <<'END'
{"title": "vimc as it is", "cameras": {"BackFacingCamera": {
  "node": {"driver": "vimc", "name": "RGB/YUV Capture"}, "size": {"width": 160, "height": 120},
  "formats": {"0": {"format": "RGB3", "interval": {"numerator": 1, "denominator": 50}}}}}}
END
stream() {
  run "$1" quazor run SingleCameraDiagnostic --phone "linux:$2" --set frameRate=50 --set maximumJitter=20 --format json
}
stream bare_before /rig/bare.json
count_buffers
stream linked vimc
cp "$dequeued/hist" "$out/hist"
stream bare_after /rig/bare.json
stream again vimc
run probe quazor phone probe --output "$out/probed.json"
rmmod vimc
