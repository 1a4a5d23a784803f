load_devices
make_channels
safety() {
  video_control platform:vivid-004 capture set 'Integer 32 Bits' 8192
  video_control platform:vivid-004 capture set Boolean 0
}
when_streaming platform:vivid-004 safety
diagnose unsafe TesselFaultDiagnostic --set experiment.frameCount=90 --set timeout=10 --set analysis.frameCount=90
wait
video_control platform:vivid-004 capture set 'Integer 32 Bits' 0
healthy_again
