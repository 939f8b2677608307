#include "ctl/show/transfers/transfer_status.h"

#include <cstdio>

namespace ctl {
namespace {

std::string faultText(std::uint32_t code) {
    switch (code) {
        case 0x000006F7:
            return "the host could not make sense of the request";
        case 0x1C010002:
            return "the host does not know the operation";
        case 0x1C010003:
            return "the host does not offer file transfer";
        case 0x1C00001B:
            return "the host is short of memory";
        default:
            break;
    }
    char text[48];
    std::snprintf(text, sizeof text, "the host answered with fault 0x%08X", code);
    return text;
}

}  // namespace

std::string statusText(const TransferAnswer& answer) {
    if (answer.fault != 0) return faultText(answer.fault);
    switch (answer.status) {
        case 0:
            return "done";
        case 1:
            return "the host has no usable depot directory";
        case 3:
            return "the name is too long";
        case 4:
            return "the host could not open the file";
        case 5:
            return "the host could not write the file";
        case 6:
            return "the host could not make the file's directory";
        default:
            return "the host answered with status " + std::to_string(answer.status);
    }
}

}  // namespace ctl
