load_devices
rmmod vivid
rm /rig/cameras
insmod /rig/modules/vimc.ko
node=$(grep -l '^RGB/YUV Capture$' /sys/class/video4linux/*/name)
minor=$(cut -d: -f2 "${node%/name}/dev")
# Without links and pads of its own.
cat >/rig/bare.json <<'END'
{"title": "vimc as it is", "cameras": {"BackFacingCamera": {
  "node": {"driver": "vimc", "name": "RGB/YUV Capture"}, "size": {"width": 160, "height": 120},
  "formats": {"0": {"format": "RGB3", "interval": {"numerator": 1, "denominator": 50}}}}}}
END
# stream LABEL PHONE [OPTION...]: judges a camera of a phone at 50 frames a second.
stream() {
  local label=$1 phone=$2
  shift 2
  run "$label" quazor run SingleCameraDiagnostic --phone "linux:$phone" --set frameRate=50 --format json "$@"
}
stream bare_before /rig/bare.json
count_buffers
stream linked vimc
dequeued_of "$minor" >"$out/buffers"
stream bare_after /rig/bare.json
stream again vimc
run probe quazor phone probe --output "$out/probed.json"
run as_probed quazor run SingleCameraDiagnostic --phone "linux:$out/probed.json" --format json
# The driver tells no rate.
sed 's/"denominator": 30/"denominator": 50/' "$out/probed.json" >/rig/corrected.json
for camera in 0 1 2; do
  stream "probed_$camera" /rig/corrected.json --set camera=$camera
done
rmmod vimc
