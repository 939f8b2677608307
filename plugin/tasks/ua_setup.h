/// The values behind a SETCONFIG request for the universal agent: those of the request, and those
/// in the instance's configuration file.
#pragma once

#include "base/zavstr.h"
#include "tasks/return_codes.h"
#include "tasks/zavtqelm.h"

/// One request and the values determined for it, in the order in which they are determined.
struct UaSetup {
    /// Takes the request's own values. The task must outlive this object.
    explicit UaSetup(TaskQueueElem& request)
        : task(request),
          product(request.getProduct()),
          metafile(request.getUaconfig()),
          scripts(request.getUascript()) {}

    TaskQueueElem& task;
    const ZAV::String product;
    const ZAV::String metafile;  ///< its name in the depot
    const ZAV::String scripts;   ///< names in the depot, separated by ","
    ZAV::String instance;        ///< empty for the default instance
    ZAV::String port;            ///< of the console; empty when none was given
    bool restart = false;        ///< the instance may be restarted for its data provider
    ZAV::String configFile;      ///< its full path
    ZAV::String metaPath;        ///< the directory for metafiles
    ZAV::String workPath;
    ZAV::String rbPath;
    ZAV::String startupProviders;  ///< data provider types, separated by ","
    ZAV::String scriptsDir;
};

/// Determines all values from the request and the configuration file; changes nothing outside
/// `setup`. On failure puts the message id and its parameter into the task. Runs the inventory
/// program.
TASK_RC prepareUaSetup(UaSetup& setup);
