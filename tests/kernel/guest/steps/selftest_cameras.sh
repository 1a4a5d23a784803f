load_devices

# phone NAME KEYS: writes the binding vivid with these keys as $out/NAME.json.
phone() {
  {
    echo "{ $2,"
    sed 1d /usr/share/quazor/bindings/vivid.json
  } >"$out/$1.json"
}

passes='"expect": {"CameraSyncDiagnostic.Front": {"verdict": "pass"}}'
refused='CaptureStream.start of FrontFacingCamera failed.'
phone healthy "$passes"
phone start_late "$passes, \"faults\": [{\"operation\": \"CaptureStream.start\", \"object\": \"FrontFacingInfraredCamera\",
  \"action\": \"delay\", \"seconds\": 0.1}]"
phone start_refused "\"expect\": {\"CameraSyncDiagnostic.Front\": {\"verdict\": \"error\", \"error\": {
    \"domain\": \"QZCapturePlugInErrorDomain\", \"code\": 204,
    \"message\": \"Failed to start steam at FrontFacingCamera port! LinuxErrorDomain code 12: $refused\"}}},
  \"faults\": [{\"operation\": \"CaptureStream.start\", \"object\": \"FrontFacingCamera\", \"action\": \"fail\"}]"
phone never_stops "$passes, \"faults\": [{\"operation\": \"CaptureStream.stop\", \"object\": \"FrontFacingCamera\",
  \"action\": \"fail\"}]"
run selftest quazor selftest "linux:$out/healthy.json" "linux:$out/start_late.json" "linux:$out/start_refused.json" \
  "linux:$out/never_stops.json" --plugin /usr/lib/quazor/camera_sensor_diagnostics.so --seeds 1 --format json
run matrix quazor selftest "linux:$out/healthy.json" "linux:$out/start_refused.json" \
  --plugin /usr/lib/quazor/camera_sensor_diagnostics.so --seeds 1
