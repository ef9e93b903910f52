#!/usr/bin/env python3
"""Routes and terminal values of a timing module.

    python3 routing.py [DEVICE]

opens DEVICE (an alias or a PXI resource name; PXI1Slot2 when none is given), writes and reads
back terminal values, routes a trigger and a clock, shows a route the module refuses, and removes
the routes again (closing the session would remove them too). Without hardware, lay out a
simulated machine first, as the README's "Opening local devices" shows.
"""
import sys

import tiktal


def main() -> None:
    device = sys.argv[1] if len(sys.argv) > 1 else "PXI1Slot2"
    with tiktal.Session(device) as module:
        print(f"{device}: serial number {module.serial_number:x}, device 0x{module.device_id:04X}")

        module.terminal_58_value = 2.5
        module.terminal_65_value = 1000.125
        for name in ("terminal_58_value", "terminal_65_value"):
            print(f"{name} = {getattr(module, name)}")
        try:
            module.terminal_72_value = -1.0  # the module holds 0 to 4294967.295
        except tiktal.Error as error:
            print(f"refused: {error}")

        module.connect_trigger("PFI0", "PXI_Trig3", invert=True)
        print("routed PFI0 -> PXI_Trig3, inverted")
        module.connect_clock("ClkIn", "PXI_Clk10")
        print("routed clock ClkIn -> PXI_Clk10")
        try:
            module.connect_trigger("ClkIn", "PXI_Trig0")  # a clock is no trigger source
        except tiktal.Error as error:
            print(f"refused: {error}")

        module.disconnect_trigger("PFI0", tiktal.ALL_CONNECTED)
        module.disconnect_clock("ClkIn", "PXI_Clk10")
        print("routes removed")


if __name__ == "__main__":
    main()
