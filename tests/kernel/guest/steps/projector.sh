load_devices
make_channels
lit() { video_control platform:vivid-004 capture get Boolean; }
when_streaming platform:vivid-004 lit
diagnose lit TesselFaultDiagnostic --set experiment.frameCount=30 --set timeout=10 --set analysis.frameCount=30
wait
run dark_after lit
