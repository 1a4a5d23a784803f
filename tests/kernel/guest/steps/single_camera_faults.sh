load_devices
bus=platform:vivid-000
camera() {
  local label=$1
  shift
  diagnose "$label" SingleCameraDiagnostic --set maximumJitter=20 "$@"
}
# Both count from shortly before their last number. The sequence's comes after 128 frames.
video_control $bus capture set 'Wrap Timestamp' 1
camera clock_beyond --set duration=2
video_control $bus capture set 'Wrap Timestamp' 0
video_control $bus capture set 'Wrap Sequence Number' 1
trace_frames
camera wrapped_sequence --set duration=5
keep_trace wrapped_sequence $bus
video_control $bus capture set 'Wrap Sequence Number' 0

# expects KEYS [FAULT]: writes the binding vivid with this outcome of the diagnostic, and with a fault.
expects() {
  echo "{ \"expect\": {\"SingleCameraDiagnostic\": {$1}},"
  [ -z "${2-}" ] || echo "  \"faults\": [{$2, \"action\": \"fail\"}],"
  sed 1d /usr/share/quazor/bindings/vivid.json
}
# refused NAME CODE MESSAGE FAULT
refused() {
  expects "\"verdict\": \"error\", \"error\": {\"domain\": \"SingleCameraErrorDomain\", \"code\": $2, \"message\": \"$3\"}" \
    "$4" >"$out/$1.json"
}
expects '"verdict": "pass"' >"$out/healthy.json"
refused control_refused 3 'The camera cannot be controlled.' '"operation": "CaptureDevice.requestControlOfStreams"'
refused rate_refused 4 'The camera does not accept MaximumFrameRate = 30.' \
  '"object": "BackFacingCamera", "operation": "CaptureStream.setValue", "property": "MaximumFrameRate"'
refused start_refused 5 'The camera does not start.' '"object": "BackFacingCamera", "operation": "CaptureStream.start"'
refused never_stops 6 'The camera does not stop.' '"object": "BackFacingCamera", "operation": "CaptureStream.stop"'
refused counters_unreadable 7 "The camera's error counters cannot be read." \
  '"object": "BackFacingCamera", "operation": "CaptureStream.valueForProperty", "property": "ErrorCounters"'
run selftest quazor selftest "linux:$out/healthy.json" "linux:$out/control_refused.json" "linux:$out/rate_refused.json" \
  "linux:$out/start_refused.json" "linux:$out/never_stops.json" "linux:$out/counters_unreadable.json" \
  --plugin /usr/lib/quazor/single_camera.so --seeds 1 --format json
