// Instances of the server on this machine: a folder each, which holds the instance's configuration file.
//
// This platform has no registry of instances. Its functions give the answers of a registry that accepts every change
// and knows nothing.
#pragma once

#include <stdbool.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// What paths are made of: <directory>instance-<name>/xanvrnd.conf.
DIRBASE_EXPORT extern const char* const dirSeparator;
DIRBASE_EXPORT extern const char* const configFileName;
DIRBASE_EXPORT extern const char* const instanceSeparator;
DIRBASE_EXPORT extern const char* const instancePrefix;

// Whether the folder of an instance is there and holds a configuration file.
//
//   name       of the instance.
//   directory  where the folders of instances are, with a separator at its end.
//
// A null argument, a missing piece, one of another kind and memory running out give false. A piece of another kind and
// a folder that can't be looked at are told to the debug log, memory running out to the message log.
DIRBASE_EXPORT bool doesInstanceExist(const char* name, const char* directory);

// True.
DIRBASE_EXPORT bool addServerInstance(const char* name, const char* configFile);
DIRBASE_EXPORT bool removeServerInstance(const char* name);

// Null: the registry knows no file, no list, no name.
DIRBASE_EXPORT char* getInstanceConfigFile(const char* name);
DIRBASE_EXPORT char** getServerInstanceList(void);
DIRBASE_EXPORT char* getNewInstanceName(void);
DIRBASE_EXPORT char* getRegConfigFileInstance(const char* configFile);

DIRBASE_C_END
