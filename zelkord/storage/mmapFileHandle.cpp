#include "zelkord/storage/mmapFileHandle.h"

namespace zelkord {

std::optional<Data> mmapFileHandle(FileHandle& handle, Error* error) { return handle.map(error); }

}  // namespace zelkord
