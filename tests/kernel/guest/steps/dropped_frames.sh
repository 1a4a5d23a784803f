load_devices
control='Percentage of Dropped Buffers'
video_control platform:vivid-003 capture set "$control" 20
count_buffers
diagnose some CameraSyncDiagnostic.Front --set duration=2.015
echo "$(buffers_of platform:vivid-003)" >"$out/buffers"
video_control platform:vivid-003 capture set "$control" 100
diagnose all CameraSyncDiagnostic.Front --set duration=2.015
video_control platform:vivid-003 capture set "$control" 0
healthy_again
