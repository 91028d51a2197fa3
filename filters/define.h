// One entry of a pass's definition list: text for the kernel compiler's options, made anew for every run.
#pragma once

#include <string>

#include "filters/parameter.h"

class TovDefine {
 public:
    // A parameter's value, or the layout of its images, under a name.
    TovDefine(std::string name, const TovFilterParameter& parameter);
    TovDefine(const TovDefine&) = delete;
    TovDefine& operator=(const TovDefine&) = delete;

    // Throws invalid parameter for a type that has no definition form.
    virtual std::string GetText() const;
    virtual ~TovDefine() = default;

 protected:
    std::string name_;
    const TovFilterParameter* parameter_;
};

// " -D COEFFS={…f}": the normalised weights of a Gaussian of the given sigma at -radius ... radius.
class GaussianCoeffsGenerator final : public TovDefine {
 public:
    GaussianCoeffsGenerator(const TovFilterParameter& sigma, const TovFilterParameter& radius);
    std::string GetText() const override;

 private:
    const TovFilterParameter* radius_;
};

// " -D CRATIO_X=… -D CRATIO_Y=…": whole source pixels per destination pixel.
class RatioToDefConverter final : public TovDefine {
 public:
    RatioToDefConverter(const TovFilterParameter& sourceSize, const TovFilterParameter& destinationSize);
    std::string GetText() const override;

 private:
    const TovFilterParameter* destinationSize_;
};
