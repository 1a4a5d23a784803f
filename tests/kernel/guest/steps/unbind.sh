load_devices
driver=/sys/bus/platform/drivers/vivid
when_streaming platform:vivid-003 sh -c "echo vivid.0 >$driver/unbind"
diagnose disturbed CameraSyncDiagnostic.Front --set duration=2.015
wait
diagnose absent CameraSyncDiagnostic.Front --set duration=2.015
echo vivid.0 >$driver/bind
until_true 5 video_control platform:vivid-004 metadata path
healthy_again
