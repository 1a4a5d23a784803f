load_devices
trace_frames
# Half a frame more than three seconds, so that the end falls between two frames.
diagnose back CameraSyncDiagnostic.Back --set duration=3.015
keep_trace back $vivid_buses
