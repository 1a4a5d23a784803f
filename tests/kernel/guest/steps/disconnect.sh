load_devices
when_streaming platform:vivid-003 video_control platform:vivid-003 capture set 'Disconnect' 1
diagnose disturbed CameraSyncDiagnostic.Front --set duration=2.015
wait
echo "$(buffers_of platform:vivid-003)" >"$out/buffers"
healthy_again
