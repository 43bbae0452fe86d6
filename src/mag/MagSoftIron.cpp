#include "mag/MagSoftIron.h"

#include "framework/Matrix3by3.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kUsage = "Usage: vantle mag-softiron [-h] ROWMATRIX\n";
constexpr const char* kOptions = R"(Options:
  -h         Print this help and exit.
Arguments:
  ROWMATRIX  Nine, floating-point values specifying a 3x3 matrix in row order

)";

constexpr const char* kConfiguration = "Magnetometer soft-iron configuration";

}  // namespace

MagSoftIron::MagSoftIron(ssc::Connection* hubConnection)
    : MagConfiguration(hubConnection, kUsage, kOptions) {}

int MagSoftIron::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  const int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  return result == ssc::kOk ? Store() : result;
}

int MagSoftIron::ParseArgs(const Arguments& arguments) {
  CopyGlobalOptions(arguments);
  const std::vector<const char*> words = WordsOf(arguments);
  if (AsksForHelp(words)) {
    PrintUsage(false);
    return kHelpPrinted;
  }
  const int result = ParseValues(words, Matrix3by3<float>::kElements, &matrix_);
  if (result != ssc::kOk) return result;
  if (matrix_.size() < Matrix3by3<float>::kElements) {
    return UsageError("9 values of ROWMATRIX are required");
  }
  return ssc::kOk;
}

int MagSoftIron::Store() {
  const int result = GetMagName();
  if (result != ssc::kOk) return result;
  ssc::say("Reading current soft-iron matrix...\n");
  return Conclude(kConfiguration, ReadAndStore(kGroup, [this](sns_registry_data* subgroup) {
                    ssc::RegistryUtil::CreateRegistryMatrix(matrix_, subgroup);
                  }));
}

int MagSoftIron::Reset() {
  const int result = GetMagName();
  if (result != ssc::kOk) return result;
  ssc::say("Resetting soft-iron correction matrix to default...\n");
  return Conclude(kConfiguration, RemoveGroupFile(kGroup, AbsentFile::kIsFailure));
}
