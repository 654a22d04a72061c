"""The commands of `vswitch --fabric`: the switches that many hosts share, for people."""
