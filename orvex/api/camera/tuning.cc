#include "orvex/api/camera/tuning.h"

#include <utility>

namespace orvex {

TuningBase::~TuningBase() = default;
TuningBlock::~TuningBlock() = default;
LscTuningBlock::~LscTuningBlock() = default;
TuningBundle::~TuningBundle() = default;
OpaqueMetadata::~OpaqueMetadata() = default;

TuningPointOpaqueMetadata::TuningPointOpaqueMetadata(std::shared_ptr<TuningPoint> tuning_point)
    : tuning_point_(std::move(tuning_point)) {}
TuningPointOpaqueMetadata::~TuningPointOpaqueMetadata() = default;

TuningMetadata::~TuningMetadata() = default;
TuningPointMetadata::~TuningPointMetadata() = default;
TuningInputMetadata::~TuningInputMetadata() = default;
TuningOutputMetadata::~TuningOutputMetadata() = default;
TuningMetadataBundle::~TuningMetadataBundle() = default;

}  // namespace orvex
