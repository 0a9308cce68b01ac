#!/usr/bin/env python3
"""reached_test.py BUILD: whether tests/reached tells from names of changed files the programs that it must. A program that it forgets
is not tested."""

import subprocess
import sys
from pathlib import Path

REACHED = Path(__file__).resolve().parents[1] / "reached"
ALL = "golden one_truth framework mi computer storage network_queries indications cpu agent agent_hostile hosttools shell hardware support"
PLUGIN = "golden agent_suse_host agent_hostile agent_kernel_tree"
ROWS = [  # a changed file, programs that it reaches, programs that it does not
    ("framework/qx/utf8.cpp", ALL, ""),
    ("network/port_type.cpp", "network_queries network_nodes network_ports " + PLUGIN, "framework hosttools shell hardware support"),
    ("storage/that_is_gone.cpp", "storage " + PLUGIN, "network_queries framework hosttools shell hardware support"),
    ("agent/cli/json.cpp", "agent agent_signals golden agent_hostile", "network_queries storage mi framework hosttools shell hardware"),
    ("agent/core/oshw/host.cpp", "agent agent_core one_truth golden", "network_queries storage mi framework hosttools shell hardware"),
    ("agent/shell/filters/cut.cpp", "shell shell_traps network_queries agent golden", "framework hosttools hardware hardware_links"),
    ("hosttools/route.cpp", "hosttools shell golden agent_kernel_tree", "framework hardware hardware_links"),
    ("plugins/hardware/patience.cpp", "hardware hardware_storage hardware_links agent_plugins", "framework network_queries shell golden"),
    ("plugins/hardware/CMakeLists.txt", "hardware hardware_links agent_plugins", "framework network_queries shell"),
    ("tests/agent/fake_plugin.cpp", "agent agent_core agent_hostile", "framework shell hardware"),
    ("tests/support/world.cpp", "mi storage agent shell golden support", "hardware_links"),
    ("tests/hosts/vlans/tree.json", ALL, ""),
    ("tests/hardware/hosts/new/x", "hardware hardware_storage", "mi golden shell agent"),
    ("docs/plug-ins.md", "agent_plugins", "framework shell hardware"),
    ("docs/testing.md", "", ALL),
    ("CMakePresets.json", ALL, ""),
    ("a/folder/that/is/new", ALL, ""),
]


def main():
    wrong = 0
    for changed, reached, others in ROWS:
        answer = subprocess.run([REACHED, sys.argv[1], "all"], input=changed, text=True, capture_output=True, check=True).stdout
        told = {name.removesuffix("_test") for name in answer.split()}
        missing, extra = set(reached.split()) - told, told & set(others.split())
        if missing or extra:
            wrong += 1
            print(f"{changed}: does not tell {sorted(missing)}, tells {sorted(extra)}")
    return 1 if wrong else 0


sys.exit(main())
