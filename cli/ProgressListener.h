#pragma once

namespace vorant::cli {

// Told how far an operation has come.
class ProgressListener {
public:
    virtual ~ProgressListener() = default;
    // `done` of `total` steps; a total of 0 means the total is unknown and
    // `done` just counts up.
    virtual void progressed(long long done, long long total) = 0;
};

}  // namespace vorant::cli
