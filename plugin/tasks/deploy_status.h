/// The row of the table KAGDYST, which is the outcome of one queued command, and the function with
/// which a task record publishes it. The table lies above the tasks, which know only this
/// declaration.
#pragma once

#include <cstddef>

/// Character columns are padded with blanks and not 0-terminated. Requesters see this layout; it is
/// the same on 32 and 64 bits.
struct zav_kagdyst_data_t {
    char originnode[64];
    char transid[84];
    char command[16];
    int retval;
    char retmsgid[16];
    char retmsgparm[256];
    char targetmsn[64];
};

static_assert(sizeof(int) == 4, "an integer column has four bytes");
static_assert(sizeof(zav_kagdyst_data_t) == 504, "the row's size is fixed");
static_assert(offsetof(zav_kagdyst_data_t, originnode) == 0, "column offsets are fixed");
static_assert(offsetof(zav_kagdyst_data_t, transid) == 64, "column offsets are fixed");
static_assert(offsetof(zav_kagdyst_data_t, command) == 148, "column offsets are fixed");
static_assert(offsetof(zav_kagdyst_data_t, retval) == 164, "column offsets are fixed");
static_assert(offsetof(zav_kagdyst_data_t, retmsgid) == 168, "column offsets are fixed");
static_assert(offsetof(zav_kagdyst_data_t, retmsgparm) == 184, "column offsets are fixed");
static_assert(offsetof(zav_kagdyst_data_t, targetmsn) == 440, "column offsets are fixed");

/// Gives `count` rows to the subscribers of KAGDYST; without subscribers the rows are lost. Returns
/// 0 or the last status with which a subscriber refused them. Any thread; throws nothing. The table
/// defines it.
int publishDeployStatus(zav_kagdyst_data_t* rows, int count);
