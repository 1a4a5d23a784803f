load_devices
run probe quazor phone probe --output "$out/probed.json"
# An emulated machine wakes the driver late, and the driver stamps the frames when it is awake.
run all quazor run --all --allow-skips --phone "linux:$out/probed.json" --set maximumJitter=20 --format json
first=$(sed -n 's/.*"busInfo": "\(.*\)".*/\1/p' "$out/probed.json" | head -n 1)
video_control "$first" capture set 'Percentage of Dropped Buffers' 20
run dropping quazor run SingleCameraDiagnostic --phone "linux:$out/probed.json" --set maximumJitter=20 --format json
video_control "$first" capture set 'Percentage of Dropped Buffers' 0
