load_devices
driver=/sys/bus/platform/drivers/vivid
plug_again() {
  echo vivid.0 >$driver/bind
  until_true 5 video_control platform:vivid-004 metadata path
}
when_streaming platform:vivid-000 sh -c "echo vivid.0 >$driver/unbind"
diagnose disturbed CameraSyncDiagnostic.Back --set duration=2.015
wait
diagnose absent CameraSyncDiagnostic.Front --set duration=2.015
plug_again
# One of these cameras has a counter in a control, which disappears with the device.
when_streaming platform:vivid-003 sh -c "echo vivid.0 >$driver/unbind"
diagnose uncounted CameraSyncDiagnostic.Front --set duration=2.015
wait
plug_again
healthy_again
