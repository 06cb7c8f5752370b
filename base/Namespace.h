#pragma once

// `zelkor` holds what programs outside the daemon may use too (base, halvane, corezelkor);
// `zelkord` is the daemon and its host services, which see all of it.
namespace zelkor {}
namespace zelkord {
using namespace zelkor;
}
