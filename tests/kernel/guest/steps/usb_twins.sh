load_usb
connect_cameras twins 4 --functions 2 --bulk
probe_machine
# The probe takes both for back cameras.
binding=$out/front.json
sed -e '/"CameraSyncDiagnostic.Front"/d' -e 's/"back": {/"front": {/' \
  -e 's/BackFacingCamera/FrontFacingCamera/; s/BackFacingTelephotoCamera/FrontFacingInfraredCamera/' \
  "$out/probed.json" >"$binding"
judge front CameraSyncDiagnostic.Front --set duration=2.015
judge_camera second --set camera=1
disconnect_cameras twins
connect_cameras leaving_twins 4 --functions 2 --bulk --unplug-after 20
judge leaving CameraSyncDiagnostic.Front --set duration=2.015
disconnect_cameras leaving_twins
