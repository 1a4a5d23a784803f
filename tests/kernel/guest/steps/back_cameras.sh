load_devices
trace_frames
# Half a frame beyond three seconds, so that the end lies between two frames.
diagnose back CameraSyncDiagnostic.Back --set duration=3.015
keep_trace back
