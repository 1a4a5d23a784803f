load_devices
trace_frames
# Half a frame more than three seconds, so that the end falls between two frames.
diagnose front CameraSyncDiagnostic.Front --set duration=3.015
keep_trace front $vivid_buses
