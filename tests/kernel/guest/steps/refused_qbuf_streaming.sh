load_devices
when_streaming platform:vivid-003 video_control platform:vivid-003 capture set 'Inject VIDIOC_QBUF Error' 1
diagnose disturbed CameraSyncDiagnostic.Front --set duration=2.015
wait
healthy_again
