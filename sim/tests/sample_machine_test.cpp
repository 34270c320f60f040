// The sample machines: the one that the README's run command uses, with its slot driver, and the
// one whose topology is a PCI architecture file. Every part of each is there and agrees.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <string>

#include "sim/common/textfile.h"
#include "sim/tests/simrun.h"

namespace velhsim::test {
namespace {

using ::testing::HasSubstr;

const std::string SAMPLE = VELHSIM_SAMPLE_MACHINE;
const std::string FILE_MACHINE = VELHSIM_FILE_MACHINE;

// Whether a PCI ID database holds the device line within its vendor's block.
bool KnowsDevice(const std::string& ids, const std::string& vendor, const std::string& device) {
    const size_t block = ids.find("\n" + vendor + "  ");
    if (block == std::string::npos) {
        return false;
    }
    // The block ends at the next line that is not indented.
    size_t end = block + 1;
    while ((end = ids.find('\n', end)) != std::string::npos && end + 1 < ids.size() &&
           ids[end + 1] == '\t') {
        ++end;
    }
    const size_t line = ids.find("\n\t" + device + "  ", block);
    return line != std::string::npos && line < end;
}

// Checks that every PCI function of the machine is named in its PCI ID database and every bound
// driver is a loaded module; the names of the drivers.
std::set<std::string> ExpectNamedDevicesAndLoadedDrivers(const std::string& machine) {
    const std::string devices = [&machine] {
        const ScratchDir dir;
        return RunScript(machine, dir / "run", "cat /proc/bus/pci/devices").Out;
    }();
    EXPECT_FALSE(devices.empty()) << machine;
    const std::string ids = FileText(machine + "/usr/share/pci.ids");
    std::set<std::string> drivers;
    for (std::string_view line : SplitLines(devices)) {
        const std::string text(line);
        const std::string driver = text.substr(text.rfind('\t') + 1);
        if (!driver.empty()) {
            drivers.insert(driver);
        }
        // Every vendor and device is in the machine's PCI ID database.
        EXPECT_TRUE(KnowsDevice(ids, text.substr(5, 4), text.substr(9, 4))) << text;
    }
    const std::string modules = machine + "/modules";
    for (const std::string& driver : drivers) {
        EXPECT_TRUE(IsRegularFile(JoinPath(JoinPath(modules, driver), "flags"))) << driver;
    }
    return drivers;
}

TEST(SampleMachine, HasAModuleForEveryBoundDriverAndNamesItsDevices) {
    EXPECT_EQ(ExpectNamedDevicesAndLoadedDrivers(SAMPLE).size(), 10u);
    EXPECT_THAT(FileText(SAMPLE + "/modules/e1000/symbols"),
                HasSubstr("__insmod_e1000_O/lib/modules/2.4.19-64GB-SMP/kernel/drivers/net/"
                          "e1000/e1000.o_M"));
}

TEST(FileMachine, HasNoDriverAndNamesItsArchitectureFileInItsFirmware) {
    const ScratchDir dir;
    const std::string run = dir / "run";
    const RunResult result = RunScript(FILE_MACHINE, run,
                                       "$PROBE open\n"
                                       "$PROBE qm velhpdrv 5 64\n"
                                       "echo $(ls /proc/bus/pci)\n"
                                       // The decoy block, then the record's type and model.
                                       "od -An -c -j $((0xF3C80 + 2)) -N 3 /dev/mem\n"
                                       "od -An -c -j $((0xF7E20 + 40)) -N 7 /dev/mem\n"
                                       "ls\n");
    EXPECT_EQ(result.Out,
              "error ENOENT\n"
              "ret 0\n"
              "error ENOENT\n"
              "00 01 02 03 04 devices\n"
              "   S   M   B\n"
              "   K   3   2   0   F   1   T\n"
              "K320F1T.pci\ndbgprint\n");
    EXPECT_FALSE(IsDirectory(run + "/driver"));
    EXPECT_EQ(ExpectNamedDevicesAndLoadedDrivers(FILE_MACHINE),
              (std::set<std::string>{"aic7xxx", "bcm5700", "eepro100", "mptbase", "qla2300",
                                     "usb-ohci"}));
    // The library's own reader takes the architecture file without a complaint.
    const RunResult compiled =
        RunProgram({PCI2ASL, FILE_MACHINE + "/install/K320F1T.pci", dir / "asl.bin"});
    EXPECT_EQ(compiled.Status, 0) << compiled.Err;
    EXPECT_EQ(FileText(dir / "asl.bin").substr(0, 4), "VHSL");
}

}  // namespace
}  // namespace velhsim::test
