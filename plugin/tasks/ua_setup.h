/// What a SETCONFIG request for the universal agent amounts to: its own values, and those of the
/// instance's configuration file.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"
#include "tasks/zavtqelm.h"

/// One request and what has been worked out for it so far, in the order in which it is.
struct UaSetup {
    /// Takes the request's own values. The task must outlive this.
    explicit UaSetup(TaskQueueElem& request)
        : task(request),
          product(request.getProduct()),
          metafile(request.getUaconfig()),
          scripts(request.getUascript()) {}

    TaskQueueElem& task;
    const ZAV::String product;
    const ZAV::String metafile;  ///< its name in the depot
    const ZAV::String scripts;   ///< names in the depot with "," between them
    ZAV::String instance;        ///< empty for the default instance
    ZAV::String port;            ///< of the console; empty when none was given
    bool restart = false;        ///< the instance may be restarted for its data provider
    ZAV::String configFile;      ///< its full path
    ZAV::String metaPath;        ///< the directory for metafiles
    ZAV::String workPath;
    ZAV::String rbPath;
    ZAV::String startupProviders;  ///< data provider types with "," between them
    ZAV::String scriptsDir;
};

/// Works out all that the request and the configuration file say, and changes nothing outside
/// `setup`. On failure the task carries the message id and its parameter. Runs the inventory
/// program.
TASK_RC prepareUaSetup(UaSetup& setup);
