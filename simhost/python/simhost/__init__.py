"""The simulated host for tests: a pytest plug-in that gives each test a host of its own."""
