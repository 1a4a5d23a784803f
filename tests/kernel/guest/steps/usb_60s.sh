load_usb
connect_cameras cameras 4 --cameras 2 --bulk
probe_machine
binding=$out/front.json
sed -e '/"CameraSyncDiagnostic.Front"/d' -e 's/"back": {/"front": {/' \
  -e 's/BackFacingCamera/FrontFacingCamera/; s/BackFacingTelephotoCamera/FrontFacingInfraredCamera/' \
  "$out/probed.json" >"$binding"
trace_frames
judge front CameraSyncDiagnostic.Front --set duration=60.015
keep_trace front $(usb_buses 2)
disconnect_cameras cameras
