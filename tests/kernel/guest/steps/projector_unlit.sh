load_devices
make_channels
when_streaming platform:vivid-004 video_control platform:vivid-004 capture set Boolean 0
diagnose unlit TesselFaultDiagnostic --set experiment.frameCount=90 --set timeout=10 --set analysis.frameCount=90
wait
healthy_again
