/// The row of the table KAGREQT: the values of a request, and the result of checking or running it.
#pragma once

#include <cstddef>

/// Character columns are padded with blanks and not 0-terminated. Requesters see this layout; it is
/// the same on 32 and 64 bits.
struct zav_kagreqt_data_t {
    char originnode[64];
    char transid[84];
    char command[16];
    char product[32];
    char context[3072];
    char optional[32];
    char uaconfig[32];
    char uascript[512];
    int retval;
    char version[12];
    char retmsgid[16];
    char retmsgparm[256];
    char targetmsn[64];
};

static_assert(sizeof(int) == 4, "an integer column has four bytes");
static_assert(sizeof(zav_kagreqt_data_t) == 4196, "the row's size is fixed");
static_assert(offsetof(zav_kagreqt_data_t, originnode) == 0, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, transid) == 64, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, command) == 148, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, product) == 164, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, context) == 196, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, optional) == 3268, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, uaconfig) == 3300, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, uascript) == 3332, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, retval) == 3844, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, version) == 3848, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, retmsgid) == 3860, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, retmsgparm) == 3876, "column offsets are fixed");
static_assert(offsetof(zav_kagreqt_data_t, targetmsn) == 4132, "column offsets are fixed");
