load_devices
count_buffers
diagnose first CameraSyncDiagnostic.Front --set duration=3.015 &
until_true 10 streaming platform:vivid-003
diagnose second CameraSyncDiagnostic.Front --set duration=2.015
wait
healthy_again
