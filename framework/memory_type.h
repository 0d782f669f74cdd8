// The records a protocol describes its addressable memory with.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace xtok {

/// One memory type of a model: what a tag's memory type field may name.
struct MemoryType {
    std::string name;
    int32_t naturalType = 2;    ///< data type code of one unit of this memory (byte)
    uint32_t icomMask = 0x200;  ///< data type bits a tag may use here
    bool readOnly = false;
    bool writeOnly = false;
    int32_t min = 0;
    int32_t max = 1;
    int32_t blockReadCount = 0;
    int32_t blockWriteCount = 0;
    bool bitWrite = false;
    bool bitRead = false;
    bool bitArrayWrite = false;
    bool swap2 = false;
    bool swap4 = false;
    bool swap8 = false;
    bool internalConversion = false;
    bool useInDatagram = false;
};

/// A named, ordered set of memory types; a node's configuration names its model.
struct Model {
    std::string name;
    std::vector<MemoryType> memoryTypes;
};

}  // namespace xtok
