load_devices
insmod /rig/modules/vimc.ko
node=$(grep -l '^RGB/YUV Capture$' /sys/class/video4linux/*/name)
minor=$(cut -d: -f2 "${node%/name}/dev")
# Without links and pads of its own.
cat >/rig/bare.json <<'END'
{"title": "vimc as it is", "cameras": {"BackFacingCamera": {
  "node": {"driver": "vimc", "name": "RGB/YUV Capture"}, "size": {"width": 160, "height": 120},
  "formats": {"0": {"format": "RGB3", "interval": {"numerator": 1, "denominator": 50}}}}}}
END
stream() {
  run "$1" quazor run SingleCameraDiagnostic --phone "linux:$2" --set frameRate=50 --format json
}
stream bare_before /rig/bare.json
count_buffers
stream linked vimc
dequeued_of "$minor" >"$out/buffers"
stream bare_after /rig/bare.json
stream again vimc
rmmod vimc
