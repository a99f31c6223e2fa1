"""Rehearses a release of the account migration over a fleet of device images, and tells what it would do to them."""
