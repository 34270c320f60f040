package com.korvane.sysmgt.tarnova.agent.cli;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import java.util.List;

/** What one run of the agent's lifecycle reports: version, prerequisite status, four tables. */
public final class Inventory {
    private final String version;
    private final long status;
    private final List<InventoryTable> tables;

    public Inventory(String version, long status, InventoryTable systems, InventoryTable busses,
                     InventoryTable slots, InventoryTable adapters) {
        this.version = version;
        this.status = status;
        this.tables = List.of(systems, busses, slots, adapters);
    }

    /**
     * Runs the lifecycle once: log, acquisition, the eight inventories, version and status,
     * and always the shutdown that stops the event monitor.
     */
    public static Inventory collect(TarnovaAgent agent) {
        agent.getDebugFileReady();
        try {
            agent.getHwInfoReady();
            return read(agent);
        } finally {
            agent.getReadyToExit();
        }
    }

    /** What the last acquisition found: the eight inventories, version and status. */
    public static Inventory read(TarnovaAgent agent) {
        InventoryTable systems = new InventoryTable("systems", InventoryTable.SYSTEM_FIELDS,
            agent.getSystemNumInv()).withText("Name", agent.getSystemNameInv());
        InventoryTable busses = new InventoryTable("busses", InventoryTable.BUS_FIELDS,
            agent.getBusNumInv());
        InventoryTable slots = new InventoryTable("slots", InventoryTable.SLOT_FIELDS,
            agent.getSlotNumInv());
        InventoryTable adapters = new InventoryTable("adapters", InventoryTable.ADAPTER_FIELDS,
            agent.getAdapterNumInv())
            .withText("Name", agent.getAdapterNameInv())
            .withText("PciId", agent.getAdapterPCIIDInv())
            .withText("Driver", agent.getAdapterDriverInv());
        return new Inventory(agent.getAgentVersionInv(), agent.getAgentNumInv(), systems, busses,
            slots, adapters);
    }

    public String version() {
        return version;
    }

    public long status() {
        return status;
    }

    /** Systems, busses, slots and adapters, in this order. */
    public List<InventoryTable> tables() {
        return tables;
    }
}
