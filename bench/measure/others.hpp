/// @file
/// Whether other programs keep the machine busy.
#pragma once

#include <ctime>
#include <fstream>
#include <string>

#include <unistd.h>

#include "measure/cpu_clock.hpp"

namespace kz::bench {

/// Watches, as long as it lives, how much processor time others take.
class OthersWork {
public:
    /// Processors that others kept busy, on average; 0.1 is a tenth of one.
    double processors() const
    {
        const double own = read_clock(CLOCK_PROCESS_CPUTIME_ID) - own_;
        return (busy_seconds() - busy_ - own) / (wall_now() - wall_);
    }

private:
    /// Of all processors since the machine started: all but idle time and waiting for devices.
    static double busy_seconds()
    {
        std::ifstream file("/proc/stat");
        std::string name;
        double user = 0;
        double nice = 0;
        double system = 0;
        double idle = 0;
        double waiting = 0;
        double interrupts = 0;
        double soft_interrupts = 0;
        double stolen = 0;
        file >> name >> user >> nice >> system >> idle >> waiting >> interrupts >>
            soft_interrupts >> stolen;
        const double ticks = user + nice + system + interrupts + soft_interrupts + stolen;
        return ticks / static_cast<double>(sysconf(_SC_CLK_TCK));
    }

    double wall_ = wall_now();
    double own_ = read_clock(CLOCK_PROCESS_CPUTIME_ID);
    double busy_ = busy_seconds();
};

} // namespace kz::bench
