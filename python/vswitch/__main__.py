"""`python3 -m vswitch` is the command `vswitch`."""

from vswitch.command import main

if __name__ == "__main__":
    main()
