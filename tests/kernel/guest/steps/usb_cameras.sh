load_usb
connect_cameras cameras 10 --cameras 5 --bulk
probe_machine
trace_frames
# Half a frame more than three seconds, so that the end falls between two frames.
judge back CameraSyncDiagnostic.Back --set duration=3.015
keep_trace back $(usb_buses 5)
trace_frames
judge front CameraSyncDiagnostic.Front --set duration=3.015
keep_trace front $(usb_buses 5)
disconnect_cameras cameras
