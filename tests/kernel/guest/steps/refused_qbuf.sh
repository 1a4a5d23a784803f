load_devices
run injection video_control platform:vivid-003 capture set 'Inject VIDIOC_QBUF Error' 1
diagnose refused CameraSyncDiagnostic.Front --set duration=2.015
healthy_again
